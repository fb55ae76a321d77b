#include "command_line/allowed_files.h"

#include <algorithm>
#include <iterator>
#include <string>
#include <vector>

#include "command_line/file_name.h"
#include "platform/installed_names.h"
#include "process/output_file.h"

namespace vela {

namespace {

constexpr const char* kImageMagick[] = {"/usr/vela/lib/convert-thumb", kImageMagickProgram};
constexpr const char* kImageMagickData[] = {kImageMagickConfiguration, kImageMagickShared,
                                            "/usr/share/color", "/usr/vela/share/imagemagick"};

void AddUnique(std::vector<std::string>& list, const std::string& text) {
  if (std::find(list.begin(), list.end(), text) == list.end()) {
    list.push_back(text);
  }
}

void AddOutput(AllowedFiles& files, const std::string& path) {
  if (IsDevice(path)) {
    AddUnique(files.devices, path);
  } else {
    AddUnique(files.outputs, DirectoryOf(path));
  }
}

void AddOutputArgument(AllowedFiles& files, const std::string& argument) {
  const std::string path = WithoutDoubledPercents(argument);
  AddOutput(files, path);
  // The name may have a format as a prefix.
  const size_t colon = path.find(':');
  if (colon != std::string::npos && path.front() != '/') {
    AddOutput(files, path.substr(colon + 1));
  }
}

}  // namespace

AllowedFiles FindAllowedFiles(const CommandLine& line) {
  AllowedFiles files = FilesOfEveryProgram();
  files.programs.insert(files.programs.end(), std::begin(kImageMagick), std::end(kImageMagick));
  files.data.insert(files.data.end(), std::begin(kImageMagickData), std::end(kImageMagickData));
  files.inputs = {line.sourceFile};
  files.outputs = {line.scratchDirectory};
  for (const size_t index : line.outputIndices) {
    AddOutputArgument(files, line.arguments[index]);
  }
  return files;
}

}  // namespace vela
