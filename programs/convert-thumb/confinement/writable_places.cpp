#include "confinement/writable_places.h"

#include <algorithm>
#include <cstdlib>
#include <optional>

#include "command_line/plan_parser.h"

namespace vela {

namespace {

constexpr char kNothing[] = "/dev/null";
constexpr char kUsualScratchDirectory[] = "/tmp";

/// Name the directory for temporary files where no option does; the first that is set.
constexpr const char* kScratchVariables[] = {"MAGICK_TEMPORARY_PATH", "MAGICK_TMPDIR", "TMPDIR"};

std::string WithoutDoubledPercents(const std::string& text) {
  std::string plain;
  for (size_t i = 0; i < text.size(); ++i) {
    plain += text[i];
    if (text[i] == '%' && i + 1 < text.size() && text[i + 1] == '%') {
      ++i;
    }
  }
  return plain;
}

std::string DirectoryOf(const std::string& path) {
  const size_t slash = path.rfind('/');
  if (slash == std::string::npos) {
    return ".";
  }
  return slash == 0 ? "/" : path.substr(0, slash);
}

void AddOnce(std::vector<std::string>& list, const std::string& text) {
  if (std::find(list.begin(), list.end(), text) == list.end()) {
    list.push_back(text);
  }
}

void AddOutput(WritablePlaces& places, const std::string& path) {
  AddOnce(places.directories, DirectoryOf(path));
  places.files.push_back(path);
}

void AddOutputArgument(WritablePlaces& places, const std::string& argument) {
  const std::string path = WithoutDoubledPercents(argument);
  AddOutput(places, path);
  // A format may stand in front of the name.
  const size_t colon = path.find(':');
  if (colon != std::string::npos && path.front() != '/') {
    AddOutput(places, path.substr(colon + 1));
  }
}

std::string ScratchDirectory(const std::vector<std::string>& arguments) {
  if (const std::optional<std::string> named = FindScratchDirectory(arguments)) {
    return *named;
  }
  for (const char* const variable : kScratchVariables) {
    const char* const directory = std::getenv(variable);
    if (directory != nullptr) {
      return directory;
    }
  }
  return kUsualScratchDirectory;
}

}  // namespace

WritablePlaces FindWritablePlaces(const std::vector<std::string>& arguments) {
  WritablePlaces places;
  places.files = {kNothing};
  places.directories = {ScratchDirectory(arguments)};
  for (size_t i = 1; i + 1 < arguments.size(); ++i) {
    if (arguments[i - 1] == "-write") {
      AddOutputArgument(places, arguments[i]);
    }
  }
  if (!arguments.empty()) {
    AddOutputArgument(places, arguments.back());
  }
  return places;
}

}  // namespace vela
