#include "decoding/photo_opener.h"

#include <strings.h>

#include "decoding/jpeg_reader.h"
#include "decoding/photo_format.h"
#include "decoding/pnm_reader.h"
#include "decoding/vips_reader.h"
#include "thumbnails.h"

namespace vela {

namespace {

bool HasTiffExtension(const std::string& path) {
  const size_t dot = path.rfind('.');
  if (dot == std::string::npos) {
    return false;
  }
  const char* const extension = path.c_str() + dot + 1;
  return strcasecmp(extension, "tif") == 0 || strcasecmp(extension, "tiff") == 0;
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
  // Raw photos of many cameras are built like a TIFF, of which the first page is a tiny preview.
  if (format == PhotoFormat::kUnknown ||
      (format == PhotoFormat::kTiff && !HasTiffExtension(plan.source))) {
    return nullptr;
  }
  return std::make_unique<VipsReader>(VipsSourceFile{descriptor, format, plan.firstPageOnly},
                                      memoryLimit);
}

}  // namespace

std::unique_ptr<PhotoReader> OpenPhoto(int descriptor, const ConversionPlan& plan,
                                       size_t memoryLimit) {
  std::unique_ptr<PhotoReader> reader = MakeReader(descriptor, plan, memoryLimit);
  if (reader == nullptr || !reader->ReadHeader() || !CanMakeThumbnails(reader->Traits(), plan)) {
    return nullptr;
  }
  return reader;
}

}  // namespace vela
