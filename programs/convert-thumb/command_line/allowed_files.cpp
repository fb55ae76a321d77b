#include "command_line/allowed_files.h"

#include <algorithm>
#include <string>
#include <vector>

#include "command_line/file_name.h"
#include "process/output_file.h"

namespace vela {

namespace {

/// Directories of shared libraries. The dynamic loader, which starts ImageMagick, is among them.
constexpr const char* kLibraries[] = {"/lib",       "/lib32",     "/lib64",        "/usr/lib",
                                      "/usr/lib32", "/usr/lib64", "/usr/local/lib"};
constexpr const char* kImageMagick[] = {"/usr/vela/lib/convert-thumb", "/usr/bin/convert-im6.q16"};

/// What libraries and ImageMagick read.
constexpr const char* kData[] = {"/etc/ImageMagick-6",
                                 "/etc/ld.so.cache",
                                 "/etc/ld.so.preload",
                                 "/etc/localtime",
                                 "/usr/share/ImageMagick-6",
                                 "/usr/share/color",
                                 "/usr/share/locale",
                                 "/usr/share/zoneinfo",
                                 "/usr/vela/share/imagemagick",
                                 "/dev/random",
                                 "/dev/urandom",
                                 "/sys/devices/system/cpu",
#if defined(CONVERT_THUMB_SANITIZED)
                                 "/proc",
#endif
                                 "/dev/zero"};

constexpr char kNullDevice[] = "/dev/null";

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
  AllowedFiles files;
  files.programs.assign(std::begin(kLibraries), std::end(kLibraries));
  files.programs.insert(files.programs.end(), std::begin(kImageMagick), std::end(kImageMagick));
  files.data.assign(std::begin(kData), std::end(kData));
  files.devices = {kNullDevice};
  files.inputs = {line.sourceFile};
  files.outputs = {line.scratchDirectory};
  for (const size_t index : line.outputIndices) {
    AddOutputArgument(files, line.arguments[index]);
  }
  return files;
}

}  // namespace vela
