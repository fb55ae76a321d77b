// Decodes a JPEG row by row, at a fraction of its size where that is enough.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>

#include "jpeg_traits.h"
#include "thumbnail_size.h"

class JpegReader {
 public:
  /// Reads from `descriptor`, which has to stay open as long as the reader is used. `memoryLimit`:
  /// bytes that the decoder may use.
  JpegReader(int descriptor, size_t memoryLimit);
  ~JpegReader();
  JpegReader(const JpegReader&) = delete;
  JpegReader& operator=(const JpegReader&) = delete;

  /// Reads up to the pixels. False when this is no JPEG that can be decoded here: damaged before
  /// its first pixel, CMYK, or of an unusual kind.
  bool ReadHeader();

  /// Size of the picture as stored; after ReadHeader.
  PictureSize FullSize() const;
  const JpegTraits& Traits() const;

  /// Chooses the smallest decoded size that serves for a picture of size `needed` and starts
  /// decoding. False when it cannot be decoded (within the memory limit).
  bool Start(PictureSize needed);

  /// Whether the picture is decoded at less than its full size.
  bool IsReduced() const;

  /// As the picture is decoded, in pixels; after Start.
  int Width() const;
  int Height() const;
  int Channels() const;  ///< 1 or 3

  /// Writes the next row from the top to `row`, which has room for Width() * Channels() samples.
  /// False when it cannot be decoded. Called at most Height() times.
  bool ReadRow(uint8_t* row);

  /// Why the last call failed.
  const char* Error() const;

 private:
  struct State;
  std::unique_ptr<State> state_;
};
