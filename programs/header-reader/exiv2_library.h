// What differs between the versions of Exiv2: 0.27 and 0.28. Nothing else knows about it.
#pragma once

#include <cstdint>
#include <exiv2/exiv2.hpp>
#include <exiv2/webpimage.hpp>
#include <memory>
#include <string>
#include <type_traits>
#include <utility>

namespace vela {

/// What Image::imageType() returns.
using Exiv2ImageType = std::remove_const_t<decltype(Exiv2::ImageType::jpeg)>;

#if EXIV2_TEST_VERSION(0, 28, 0)

/// The types of BasicIo's counts of bytes, of its offsets and of its path.
using Exiv2Size = size_t;
using Exiv2Offset = int64_t;
using Exiv2Path = const std::string&;

/// Returns null when Exiv2 does not know the format.
inline std::unique_ptr<Exiv2::Image> OpenExiv2Image(std::unique_ptr<Exiv2::BasicIo> input) {
  return Exiv2::ImageFactory::open(std::move(input));
}

/// Also reads HEIC, AVIF and CR3. Always the case.
inline void EnableExiv2Bmff() {}

inline Exiv2::byte* BytesOf(Exiv2::DataBuf& buffer) {
  return buffer.data();
}

/// Drops the end of the buffer.
inline void Shorten(Exiv2::DataBuf& buffer, Exiv2Size size) {
  buffer.resize(size);
}

#else

using Exiv2Size = long;
using Exiv2Offset = long;
using Exiv2Path = std::string;

// Exiv2 returns pointers of a type that C++17 no longer has.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

inline std::unique_ptr<Exiv2::Image> OpenExiv2Image(std::unique_ptr<Exiv2::BasicIo> input) {
  return std::unique_ptr<Exiv2::Image>(
      Exiv2::ImageFactory::open(Exiv2::BasicIo::AutoPtr(input.release())).release());
}

#pragma GCC diagnostic pop

inline void EnableExiv2Bmff() {
  Exiv2::enableBMFF(true);
}

inline Exiv2::byte* BytesOf(Exiv2::DataBuf& buffer) {
  return buffer.pData_;
}

inline void Shorten(Exiv2::DataBuf& buffer, Exiv2Size size) {
  buffer.size_ = size;
}

#endif

/// The width or height of an image as its header has it, negative where the format permits that.
inline int32_t SignedPixels(uint32_t pixels) {
  return static_cast<int32_t>(pixels);
}

}  // namespace vela
