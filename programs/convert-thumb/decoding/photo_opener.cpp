#include "decoding/photo_opener.h"

#include <utility>

#include "command_line/file_name.h"
#include "decoding/jpeg_reader.h"
#include "decoding/pnm_reader.h"
#include "decoding/vips_reader.h"
#include "picture/photo_format.h"

namespace vela {

namespace {

bool HasTiffExtension(const std::string& path) {
  const std::string_view extension = ExtensionOf(path);
  return EqualsIgnoringCase(extension, "tif") || EqualsIgnoringCase(extension, "tiff");
}

bool IsReadByVips(PhotoFormat format, const std::string& path) {
  switch (format) {
    case PhotoFormat::kTiff:
      // Many camera raw formats are based on TIFF, with a tiny preview as the first page.
      return HasTiffExtension(path);
    case PhotoFormat::kPng:
    case PhotoFormat::kGif:
    case PhotoFormat::kWebp:
    case PhotoFormat::kHeif:
    case PhotoFormat::kJpeg2000:
      return true;
    default:
      return false;
  }
}

std::unique_ptr<PhotoReader> MakeReader(int descriptor, const ConversionPlan& plan,
                                        size_t memoryLimit) {
  const PhotoFormat format = FormatOf(descriptor);
  if (format == PhotoFormat::kJpeg) {
    return std::make_unique<JpegReader>(descriptor, memoryLimit);
  }
  if (format == PhotoFormat::kPnm) {
    return std::make_unique<PnmReader>(descriptor, plan.firstPageOnly);
  }
  if (!IsReadByVips(format, plan.source)) {
    return nullptr;
  }
  return std::make_unique<VipsReader>(VipsSourceFile{descriptor, format, plan.firstPageOnly},
                                      memoryLimit);
}

}  // namespace

std::unique_ptr<PhotoReader> OpenPhoto(int descriptor, const ConversionPlan& plan,
                                       size_t memoryLimit) {
  std::unique_ptr<PhotoReader> reader = MakeReader(descriptor, plan, memoryLimit);
  return reader != nullptr && reader->ReadHeader() ? std::move(reader) : nullptr;
}

}  // namespace vela
