// A photo that is decoded row by row.
#pragma once

#include <cstddef>
#include <cstdint>

#include "picture/photo_traits.h"
#include "picture/thumbnail_size.h"

namespace vela {

/// Larger photos are left to ImageMagick.
constexpr uint64_t kMaxPixels = 1000000000;

/// Decoder of one photo.

class PhotoReader {
 public:
  virtual ~PhotoReader() = default;

  /// Reads everything before the pixels. Returns false when this decoder does not support the
  /// photo.
  virtual bool ReadHeader() = 0;

  /// Size and properties of the picture as stored. Valid after ReadHeader.
  virtual PictureSize FullSize() const = 0;
  virtual const PhotoTraits& Traits() const = 0;

  /// Starts decoding at the smallest size that is sufficient for a picture of size `needed`.
  /// Returns false when it cannot be decoded, or not within the memory limit.
  virtual bool Start(PictureSize needed) = 0;

  /// Returns true when the picture is decoded at less than its full size.
  virtual bool IsReduced() const = 0;

  /// Size of the decoded picture in pixels. Valid after Start.
  virtual int Width() const = 0;
  virtual int Height() const = 0;
  virtual int Channels() const = 0;       ///< 1, 3 or 4
  virtual size_t SampleSize() const = 0;  ///< bytes: 1 (0 to 255) or 2 (uint16_t, 0 to 65535)

  /// Writes the next row from the top to `row`, which has room for Width() * Channels() samples and
  /// is aligned for them. Returns false when it cannot be decoded. Called at most Height() times.
  virtual bool ReadRow(uint8_t* row) = 0;

  /// Called at the end of a thread that has read rows; no more rows are read after that.
  virtual void LeaveThread() {}

  /// Returns why the last call failed.
  virtual const char* Error() const = 0;

 protected:
  PhotoReader() = default;
  PhotoReader(const PhotoReader&) = default;
  PhotoReader& operator=(const PhotoReader&) = default;
};

}  // namespace vela
