#include "command_line/writable_paths.h"

#include <algorithm>

#include "command_line/file_name.h"

namespace vela {

namespace {

constexpr char kNullDevice[] = "/dev/null";

void AddUnique(std::vector<std::string>& list, const std::string& text) {
  if (std::find(list.begin(), list.end(), text) == list.end()) {
    list.push_back(text);
  }
}

void AddOutput(WritablePaths& paths, const std::string& path) {
  AddUnique(paths.directories, DirectoryOf(path));
}

void AddOutputArgument(WritablePaths& paths, const std::string& argument) {
  const std::string path = WithoutDoubledPercents(argument);
  AddOutput(paths, path);
  // The name may have a format as a prefix.
  const size_t colon = path.find(':');
  if (colon != std::string::npos && path.front() != '/') {
    AddOutput(paths, path.substr(colon + 1));
  }
}

}  // namespace

WritablePaths FindWritablePaths(const CommandLine& line) {
  WritablePaths paths;
  paths.files = {kNullDevice};
  paths.directories = {line.scratchDirectory};
  for (const size_t index : line.outputIndices) {
    AddOutputArgument(paths, line.arguments[index]);
  }
  return paths;
}

}  // namespace vela
