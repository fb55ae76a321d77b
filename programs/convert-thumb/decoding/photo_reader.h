// A photo that is decoded row by row.
#pragma once

#include <cstddef>
#include <cstdint>

#include "decoding/photo_traits.h"
#include "picture/thumbnail_size.h"

namespace vela {

/// Of a photo that is decoded here.
constexpr uint64_t kMostPixels = 1000000000;

class PhotoReader {
 public:
  virtual ~PhotoReader() = default;

  /// Reads up to the pixels. False when the photo cannot be decoded here as it should be.
  virtual bool ReadHeader() = 0;

  /// Size of the picture as stored; after ReadHeader.
  virtual PictureSize FullSize() const = 0;
  virtual const PhotoTraits& Traits() const = 0;

  /// Chooses the smallest decoded size that serves for a picture of size `needed` and starts
  /// decoding. False when it cannot be decoded (within the memory limit).
  virtual bool Start(PictureSize needed) = 0;

  /// Whether the picture is decoded at less than its full size.
  virtual bool IsReduced() const = 0;

  /// As the picture is decoded, in pixels; after Start.
  virtual int Width() const = 0;
  virtual int Height() const = 0;
  virtual int Channels() const = 0;       ///< 1, 3 or 4
  virtual size_t SampleSize() const = 0;  ///< bytes: 1 (0 to 255) or 2 (uint16_t, 0 to 65535)

  /// Writes the next row from the top to `row`, which has room for Width() * Channels() samples and
  /// is aligned for them. False when it cannot be decoded. Called at most Height() times.
  virtual bool ReadRow(uint8_t* row) = 0;

  /// Called by a thread that has read rows, before it ends: no more rows are read then.
  virtual void LeaveThread() {}

  /// Why the last call failed.
  virtual const char* Error() const = 0;

 protected:
  PhotoReader() = default;
  PhotoReader(const PhotoReader&) = default;
  PhotoReader& operator=(const PhotoReader&) = default;
};

}  // namespace vela
