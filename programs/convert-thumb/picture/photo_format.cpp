#include "picture/photo_format.h"

#include <cstddef>
#include <string>
#include <string_view>

#include "process/source_file.h"

namespace vela {

namespace {

using std::literals::string_view_literals::operator""sv;

constexpr size_t kSignatureBytes = 16;

struct Signature {
  size_t offset;
  std::string_view bytes;
  PhotoFormat format;
};

constexpr Signature kSignatures[] = {
    {0, "\xFF\xD8\xFF"sv, PhotoFormat::kJpeg},
    {0, "\xFF\xD8"sv, PhotoFormat::kOtherJpeg},
    {0, "\x89PNG\r\n\x1A\n"sv, PhotoFormat::kPng},
    {0, "II*\0"sv, PhotoFormat::kTiff},
    {0, "MM\0*"sv, PhotoFormat::kTiff},
    {0, "P5"sv, PhotoFormat::kPnm},
    {0, "P6"sv, PhotoFormat::kPnm},
    {0, "GIF87a"sv, PhotoFormat::kGif},
    {0, "GIF89a"sv, PhotoFormat::kGif},
    {8, "WEBPVP8"sv, PhotoFormat::kWebp},
    {0, "II+\0"sv, PhotoFormat::kBigTiff},
    {0, "MM\0+"sv, PhotoFormat::kBigTiff},
    {0, "P1"sv, PhotoFormat::kOtherPnm},
    {0, "P2"sv, PhotoFormat::kOtherPnm},
    {0, "P3"sv, PhotoFormat::kOtherPnm},
    {0, "P4"sv, PhotoFormat::kOtherPnm},
    {0, "P7"sv, PhotoFormat::kPam},
    {4, "ftypheic"sv, PhotoFormat::kHeif},
    {4, "ftypheix"sv, PhotoFormat::kHeif},
    {4, "ftypmif1"sv, PhotoFormat::kHeif},
    {4, "ftypavif"sv, PhotoFormat::kHeif},
    {4, "ftypavis"sv, PhotoFormat::kOtherHeif},
    {4, "ftypheim"sv, PhotoFormat::kOtherHeif},
    {4, "ftypheis"sv, PhotoFormat::kOtherHeif},
    {4, "ftyphevc"sv, PhotoFormat::kOtherHeif},
    {4, "ftyphevx"sv, PhotoFormat::kOtherHeif},
    {4, "ftypmiaf"sv, PhotoFormat::kOtherHeif},
    {4, "ftypmsf1"sv, PhotoFormat::kOtherHeif},
    {0, "\xFF\x4F\xFF\x51"sv, PhotoFormat::kJpeg2000Codestream},
    {0, "BM"sv, PhotoFormat::kBmp},
    {0, "BA"sv, PhotoFormat::kBmp},
    {0, "8BPS"sv, PhotoFormat::kPsd},
    {4, "jP  \r\n\x87\n"sv, PhotoFormat::kJpeg2000},
};

}  // namespace

PhotoFormat FormatOf(int descriptor) {
  char buffer[kSignatureBytes];
  const int64_t count = ReadSomeAt(descriptor, buffer, sizeof buffer, 0);
  const std::string_view start(buffer, count > 0 ? static_cast<size_t>(count) : 0);
  for (const Signature& signature : kSignatures) {
    if (start.size() >= signature.offset &&
        start.compare(signature.offset, signature.bytes.size(), signature.bytes) == 0) {
      return signature.format;
    }
  }
  return PhotoFormat::kUnknown;
}

}  // namespace vela
