// Decodes a JPEG row by row, at a fraction of its size where that is sufficient.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>

#include "decoding/photo_reader.h"

namespace vela {

class JpegReader final : public PhotoReader {
 public:
  /// `descriptor`: must stay open while the reader is used. `memoryLimit`: bytes that the decoder
  /// may use.
  JpegReader(int descriptor, size_t memoryLimit);
  ~JpegReader() override;
  JpegReader(const JpegReader&) = delete;
  JpegReader& operator=(const JpegReader&) = delete;

  /// Returns false when the file is damaged before its first pixel or of an unsupported kind.
  bool ReadHeader() override;
  PictureSize FullSize() const override;
  const PhotoTraits& Traits() const override;
  bool Start(PictureSize needed) override;
  bool IsReduced() const override;
  int Width() const override;
  int Height() const override;
  int Channels() const override;
  size_t SampleSize() const override { return sizeof(uint8_t); }
  bool ReadRow(uint8_t* row) override;
  const char* Error() const override;

 private:
  struct State;
  std::unique_ptr<State> state_;
};

}  // namespace vela
