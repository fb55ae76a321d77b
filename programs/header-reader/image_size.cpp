#include "image_size.h"

#include <algorithm>
#include <cstdlib>
#include <exception>
#include <exiv2/exiv2.hpp>
#include <exiv2/webpimage.hpp>
#include <iterator>
#include <limits>
#include <memory>

#include "ppm_size.h"
#include "stream_io.h"

namespace vela {

namespace {

// Exiv2 returns pointers of a type that C++17 no longer has.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

/// Returns null when Exiv2 does not know the format.
std::unique_ptr<Exiv2::Image> OpenImage(FILE* file) {
  Exiv2::BasicIo::AutoPtr input(new StreamIo(file));
  return std::unique_ptr<Exiv2::Image>(Exiv2::ImageFactory::open(input).release());
}

#pragma GCC diagnostic pop

/// Exiv2 also reads formats other than photos, some of them completely and slowly.
bool IsPhotoType(int imageType) {
  namespace type = Exiv2::ImageType;
  constexpr int kPhotoTypes[] = {type::jpeg, type::png, type::gif,  type::bmp, type::tiff,
                                 type::webp, type::psd, type::bmff, type::arw, type::cr2,
                                 type::crw,  type::dng, type::mrw,  type::nef, type::orf,
                                 type::pef,  type::raf, type::rw2,  type::sr2, type::srw};
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
  const std::unique_ptr<Exiv2::Image> image = OpenImage(file);
  if (!image) {
    return ReadPpmSize(file);
  }
  if (!IsPhotoType(image->imageType())) {
    return {};
  }
  ReadHeader(*image);
  const PixelSize size{image->pixelWidth(), image->pixelHeight()};
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
  Exiv2::enableBMFF(true);
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
