#include "imagemagick/handed_source.h"

#include <cerrno>
#include <cstring>
#include <optional>
#include <string>
#include <utility>

#include "command_line/file_name.h"
#include "imagemagick/coder_names.h"
#include "picture/photo_format.h"
#include "platform/velaindex.h"
#include "process/failure_report.h"
#include "process/source_file.h"
#include "process/trusted_path.h"

namespace vela {

namespace {

/// Returns true when an argument that names no file can be passed on unchanged: an option, or a
/// file that nobody else can create before ImageMagick looks for it.
bool CanStayMissing(const std::string& argument) {
  if (!argument.empty() && argument.front() == '-') {
    return true;
  }
  const std::optional<Place> place = FindPlace(argument);
  return IsPlainName(argument) && place && IsPrivate(place->directory);
}

/// Returns the prefix of the photo's coder; empty, after a call of ReportFailure, when its format
/// is not known. Camera raw files look like TIFFs, but only their preview would be read.
std::string ChooseCoder(const std::string& file, const FileDescriptor& source) {
  const PhotoFormat format = FormatOf(source.Get());
  const std::string extension(ExtensionOf(file));
  if (format == PhotoFormat::kUnknown && EqualsIgnoringCase(extension, "tga")) {
    return "TGA:";  // its files have no signature
  }
  const bool isRaw = format == PhotoFormat::kTiff && BlVELAIndexIsRawImage(extension.c_str());
  std::string prefix = isRaw ? "" : CoderPrefix(format);
  if (prefix.empty()) {
    ReportFailure("%s: not a photo in a known format", file.c_str());
  }
  return prefix;
}

/// Replaces the output of a photo that is turned in place: ImageMagick opens and truncates it under
/// that name. Returns false when writing to the file could change that of another user.
bool HandAsOutput(const std::string& file, const std::string& coder, const FileDescriptor& source,
                  std::string& argument) {
  if (!MayBeOverwritten(file, source)) {
    ReportFailure("%s: not replaced, because it is a link, has several names or is not yours",
                  file.c_str());
    return false;
  }
  const std::string prefix = CoderPrefix(std::string(ExtensionOf(file)));
  argument = (prefix.empty() ? coder : prefix) + NameOf(source);
  return true;
}

}  // namespace

bool HandSource(const CommandLine& line, HandedLine& handed) {
  const size_t index = line.sourceIndex;
  if (index == handed.arguments.size()) {
    return true;
  }
  const std::string& file = line.sourceFile;
  FileDescriptor source = OpenSource(file);
  if (!source.IsOpen()) {
    const int error = errno;
    if (error == ENOENT && CanStayMissing(file)) {
      return true;
    }
    ReportFailure("%s: %s", file.c_str(), std::strerror(error));
    return false;
  }
  if (TypeOf(source.Get()) != FileType::kRegular) {
    ReportFailure("%s: not a regular file", file.c_str());
    return false;
  }
  const std::string coder = ChooseCoder(file, source);
  if (coder.empty()) {
    return false;
  }
  const std::string pageSelection = handed.arguments[index].substr(file.size());
  handed.arguments[index] = coder + NameOf(source) + pageSelection;
  const bool isTurned = index + 1 < handed.arguments.size() && handed.arguments.back() == file;
  if (isTurned && !HandAsOutput(file, coder, source, handed.arguments.back())) {
    return false;
  }
  handed.inputs.push_back(std::move(source));
  return true;
}

}  // namespace vela
