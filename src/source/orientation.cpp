#include "source/orientation.h"

#include <cstdlib>
#include <cstring>

#include "header/header_reader.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/log.h"
#include "source/tool_output.h"
#include "storage/log_source.h"

using namespace vela;

namespace {

constexpr char kExiftoolPath[] = "/usr/vela/bin/exiftool";
constexpr char kRotationTag[] = "Rotation";
constexpr char kUprightText[] = "top - left";

/// Some builds of the library spell the upright orientation differently.
std::string CanonicalText(const char* text) {
  return std::strcmp(text, "Top-left") == 0 ? kUprightText : text;
}

/// Returns the library's text for the orientation of an image, empty when it has none or no
/// EXIF data; the latter is logged.
std::string ReadOrientationText(const std::string& path) {
  std::optional<std::string> text = ReadExifOrientation(path);
  if (!text) {
    LogError(kProgramLogSource, 696,
             std::string(kProgramLogSource) + " (696) File not readable or no EXIF data in file " +
                 path + ".\n");
    return {};
  }
  StringTrim(text->data());
  return CanonicalText(text->c_str());
}

/// Returns the value of the raw photo's rotation tag, empty when it has none.
std::string ReadRotationTag(const std::string& rawPath) {
  const std::string option = std::string("-") + kRotationTag;
  ToolOutput output(VLIBCPopen(kExiftoolPath, "r", "-S", option.c_str(), rawPath.c_str(), nullptr));
  if (!output.IsOpen()) {
    LogError(kProgramLogSource, 196,
             "[Error] VLIBCPopen: " + std::string(kExiftoolPath) + " -S -" + kRotationTag + " " +
                 rawPath);
    return {};
  }
  std::string value;
  while (const auto line = output.ReadLine()) {
    const auto tag = SplitTagLine(*line);
    if (tag && tag->name == kRotationTag) {
      value = tag->value;
    }
  }
  return value;
}

}  // namespace

int GetRawPreviewRotation(const std::string& rawPath, const std::string& previewPath) {
  if (ReadOrientationText(previewPath) != kUprightText) {
    return 0;
  }
  return static_cast<int>(std::strtol(ReadRotationTag(rawPath).c_str(), nullptr, 10));
}
