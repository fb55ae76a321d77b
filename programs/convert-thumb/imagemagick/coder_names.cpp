#include "imagemagick/coder_names.h"

#include <algorithm>
#include <cstring>
#include <iterator>

#include "command_line/file_name.h"

namespace vela {

namespace {

constexpr const char* kExtensions[] = {"jpg",  "jpeg", "jpe",  "png",  "gif",  "bmp", "tif",
                                       "tiff", "webp", "heic", "heif", "avif", "jp2", "psd",
                                       "ppm",  "pgm",  "pbm",  "pnm",  "pam"};

bool IsPlainByte(unsigned char byte) {
  return byte >= 0x80 || (byte >= '0' && byte <= '9') || (byte >= 'A' && byte <= 'Z') ||
         (byte >= 'a' && byte <= 'z') || std::strchr("/._-+,= ", byte) != nullptr;
}

}  // namespace

std::string CoderPrefix(PhotoFormat format) {
  switch (format) {
    case PhotoFormat::kUnknown:
      break;
    case PhotoFormat::kJpeg:
    case PhotoFormat::kOtherJpeg:
      return "JPEG:";
    case PhotoFormat::kPng:
      return "PNG:";
    case PhotoFormat::kTiff:
    case PhotoFormat::kBigTiff:
      return "TIFF:";
    case PhotoFormat::kPnm:
    case PhotoFormat::kOtherPnm:
      return "PNM:";
    case PhotoFormat::kPam:
      return "PAM:";
    case PhotoFormat::kGif:
      return "GIF:";
    case PhotoFormat::kWebp:
      return "WEBP:";
    case PhotoFormat::kHeif:
    case PhotoFormat::kOtherHeif:
      return "HEIC:";
    case PhotoFormat::kJpeg2000:
      return "JP2:";
    case PhotoFormat::kJpeg2000Codestream:
      return "J2K:";
    case PhotoFormat::kBmp:
      return "BMP:";
    case PhotoFormat::kPsd:
      return "PSD:";
  }
  return "";
}

std::string CoderPrefix(const std::string& extension) {
  const bool isKnown =
      std::any_of(std::begin(kExtensions), std::end(kExtensions),
                  [&](const char* known) { return EqualsIgnoringCase(extension, known); });
  return isKnown ? extension + ":" : "";
}

bool IsPlainName(const std::string& name) {
  if (name.empty() || name.front() == '-') {
    return false;
  }
  return std::all_of(name.begin(), name.end(), [](char character) {
    return character != '\0' && IsPlainByte(static_cast<unsigned char>(character));
  });
}

}  // namespace vela
