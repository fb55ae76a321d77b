#include "image_size.h"

#include <algorithm>
#include <cstdlib>
#include <exception>
#include <iterator>
#include <limits>
#include <memory>

#include "exiv2_library.h"
#include "ppm_size.h"
#include "stream_io.h"

namespace vela {

namespace {

/// Exiv2 also reads formats other than photos, some of them completely and slowly.
bool IsPhotoType(Exiv2ImageType imageType) {
  constexpr Exiv2ImageType kPhotoTypes[] = {
      Exiv2::ImageType::jpeg, Exiv2::ImageType::png,  Exiv2::ImageType::gif, Exiv2::ImageType::bmp,
      Exiv2::ImageType::tiff, Exiv2::ImageType::webp, Exiv2::ImageType::psd, Exiv2::ImageType::bmff,
      Exiv2::ImageType::arw,  Exiv2::ImageType::cr2,  Exiv2::ImageType::crw, Exiv2::ImageType::dng,
      Exiv2::ImageType::mrw,  Exiv2::ImageType::nef,  Exiv2::ImageType::orf, Exiv2::ImageType::pef,
      Exiv2::ImageType::raf,  Exiv2::ImageType::rw2,  Exiv2::ImageType::sr2, Exiv2::ImageType::srw};
  return std::find(std::begin(kPhotoTypes), std::end(kPhotoTypes), imageType) !=
         std::end(kPhotoTypes);
}

/// A file that is damaged or truncated after its header still has the size in the header.
void ReadHeader(Exiv2::Image& image) {
  try {
    image.readMetadata();
  } catch (const std::exception&) {
    return;
  }
}

/// Returns an empty size when none can be read.
PixelSize ReadPixelSize(FILE* file) {
  const std::unique_ptr<Exiv2::Image> image = OpenExiv2Image(std::make_unique<StreamIo>(file));
  if (!image) {
    return ReadPpmSize(file);
  }
  if (!IsPhotoType(image->imageType())) {
    return {};
  }
  ReadHeader(*image);
  const PixelSize size{SignedPixels(image->pixelWidth()), SignedPixels(image->pixelHeight())};
  // A negative height means that the rows of a bitmap are stored from top to bottom.
  const bool isBitmap = image->imageType() == Exiv2::ImageType::bmp;
  return isBitmap ? PixelSize{size.width, std::abs(size.height)} : size;
}

bool IsPixelCount(int64_t count) {
  return count > 0 && count <= std::numeric_limits<uint32_t>::max();
}

}  // namespace

void InitializeImageLibrary() {
  Exiv2::LogMsg::setLevel(Exiv2::LogMsg::mute);
  EnableExiv2Bmff();
  Exiv2::XmpParser::initialize();
}

bool ReadImageSize(FILE* file, uint32_t& width, uint32_t& height) {
  PixelSize size;
  try {
    size = ReadPixelSize(file);
  } catch (...) {
    return false;
  }
  if (!IsPixelCount(size.width) || !IsPixelCount(size.height)) {
    return false;
  }
  width = static_cast<uint32_t>(size.width);
  height = static_cast<uint32_t>(size.height);
  return true;
}

}  // namespace vela
