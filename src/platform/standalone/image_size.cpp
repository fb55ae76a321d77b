#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <exception>
#include <exiv2/exiv2.hpp>
#include <exiv2/webpimage.hpp>
#include <iterator>
#include <limits>
#include <memory>
#include <mutex>

#include "platform/standalone/last_error.h"
#include "platform/standalone/pixel_size.h"
#include "platform/standalone/ppm_size.h"
#include "platform/velaindex.h"

namespace {

using vela::Fail;
using vela::PixelSize;

/// The library's XMP parts are not safe to use from several threads without this.
void LockXmp(void* mutex, bool isLock) {
  auto* xmpMutex = static_cast<std::recursive_mutex*>(mutex);
  if (isLock) {
    xmpMutex->lock();
  } else {
    xmpMutex->unlock();
  }
}

void PrepareLibrary() {
  static std::once_flag isPrepared;
  static std::recursive_mutex xmpMutex;
  std::call_once(isPrepared, [] {
    Exiv2::LogMsg::setLevel(Exiv2::LogMsg::mute);
    Exiv2::enableBMFF(true);
    Exiv2::XmpParser::initialize(LockXmp, &xmpMutex);
  });
}

/// Returns 0 or an errno value. Anything but a regular file could make the library wait.
int CheckRegularFile(const char* path) {
  struct stat status;
  if (stat(path, &status) != 0) return errno;
  if (S_ISDIR(status.st_mode)) return EISDIR;
  return S_ISREG(status.st_mode) ? 0 : EINVAL;
}

// The library's pointers are of a kind that the language has withdrawn.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

/// Returns null when the file is of no kind that the library knows. The library's other way to open
/// files takes some paths for addresses of remote ones.
std::unique_ptr<Exiv2::Image> OpenImage(const char* path) {
  Exiv2::BasicIo::AutoPtr file(new Exiv2::FileIo(path));
  return std::unique_ptr<Exiv2::Image>(Exiv2::ImageFactory::open(file).release());
}

#pragma GCC diagnostic pop

/// The library also reads kinds that are no photos, some of them whole and at great cost.
bool IsPhotoType(int imageType) {
  namespace type = Exiv2::ImageType;
  constexpr int kPhotoTypes[] = {type::jpeg, type::png, type::gif,  type::bmp, type::tiff,
                                 type::webp, type::psd, type::bmff, type::arw, type::cr2,
                                 type::crw,  type::dng, type::mrw,  type::nef, type::orf,
                                 type::pef,  type::raf, type::rw2,  type::sr2, type::srw};
  return std::find(std::begin(kPhotoTypes), std::end(kPhotoTypes), imageType) !=
         std::end(kPhotoTypes);
}

/// A file that is damaged or cut behind its header still has the size that the header tells.
void ReadHeader(Exiv2::Image& image) {
  try {
    image.readMetadata();
  } catch (const std::exception&) {
    return;
  }
}

/// Returns an empty size when there is none to be read.
PixelSize ReadPixelSize(const char* path) {
  const std::unique_ptr<Exiv2::Image> image = OpenImage(path);
  if (!image) return vela::ReadPpmSize(path);
  if (!IsPhotoType(image->imageType())) return {};
  ReadHeader(*image);
  const PixelSize size{image->pixelWidth(), image->pixelHeight()};
  // The negative height of a bitmap says that its rows come from the top.
  const bool isBitmap = image->imageType() == Exiv2::ImageType::bmp;
  return isBitmap ? PixelSize{size.width, std::abs(size.height)} : size;
}

bool IsPixelCount(int64_t count) {
  return count > 0 && count <= std::numeric_limits<uint32_t>::max();
}

}  // namespace

int VELAIndexImgResGet(const char* path, uint32_t* width, uint32_t* height) {
  if (path == nullptr || width == nullptr || height == nullptr) return Fail(EINVAL);
  const int error = CheckRegularFile(path);
  if (error != 0) return Fail(error);
  PixelSize size;
  try {
    PrepareLibrary();
    size = ReadPixelSize(path);
  } catch (...) {
    return Fail(EINVAL);
  }
  if (!IsPixelCount(size.width) || !IsPixelCount(size.height)) return Fail(EINVAL);
  *width = static_cast<uint32_t>(size.width);
  *height = static_cast<uint32_t>(size.height);
  return 0;
}
