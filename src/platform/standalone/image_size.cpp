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
#include <optional>

#include "platform/standalone/last_error.h"
#include "platform/standalone/ppm_size.h"
#include "platform/velaindex.h"
#include "posix/files.h"

namespace {

using vela::Fail;
using vela::PixelSize;

/// Exiv2's XMP code is not thread-safe without this.
void LockXmp(void* mutex, bool isLock) {
  auto* xmpMutex = static_cast<std::recursive_mutex*>(mutex);
  if (isLock) {
    xmpMutex->lock();
  } else {
    xmpMutex->unlock();
  }
}

void InitializeLibrary() {
  static std::once_flag isInitialized;
  static std::recursive_mutex xmpMutex;
  std::call_once(isInitialized, [] {
    Exiv2::LogMsg::setLevel(Exiv2::LogMsg::mute);
    Exiv2::enableBMFF(true);
    Exiv2::XmpParser::initialize(LockXmp, &xmpMutex);
  });
}

/// Returns 0 or an errno value. Exiv2 might wait for anything but a regular file.
int CheckRegularFile(const char* path) {
  const std::optional<vela::FileStatus> status = vela::ExamineFile(path);
  if (!status) {
    return errno;
  }
  if (status->isDirectory) {
    return EISDIR;
  }
  return status->isRegular ? 0 : EINVAL;
}

// Exiv2 returns pointers of a type that C++17 no longer has.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

/// Returns null when Exiv2 does not know the format. Its function that opens a path would take some
/// paths for the addresses of remote files.
std::unique_ptr<Exiv2::Image> OpenImage(const char* path) {
  Exiv2::BasicIo::AutoPtr file(new Exiv2::FileIo(path));
  return std::unique_ptr<Exiv2::Image>(Exiv2::ImageFactory::open(file).release());
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
PixelSize ReadPixelSize(const char* path) {
  const std::unique_ptr<Exiv2::Image> image = OpenImage(path);
  if (!image) {
    return vela::ReadPpmSize(path);
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

int VELAIndexImgResGet(const char* path, uint32_t* width, uint32_t* height) {
  if (path == nullptr || width == nullptr || height == nullptr) {
    return Fail(EINVAL);
  }
  const int error = CheckRegularFile(path);
  if (error != 0) {
    return Fail(error);
  }
  PixelSize size;
  try {
    InitializeLibrary();
    size = ReadPixelSize(path);
  } catch (...) {
    return Fail(EINVAL);
  }
  if (!IsPixelCount(size.width) || !IsPixelCount(size.height)) {
    return Fail(EINVAL);
  }
  *width = static_cast<uint32_t>(size.width);
  *height = static_cast<uint32_t>(size.height);
  return 0;
}
