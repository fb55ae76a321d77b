// Decodes photos of most formats by libvips.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>

#include "decoding/photo_format.h"
#include "decoding/photo_reader.h"

namespace vela {

/// What VipsReader reads.
struct VipsSourceFile {
  int descriptor = -1;                         ///< open as long as the reader is used
  PhotoFormat format = PhotoFormat::kUnknown;  ///< any but kJpeg and kPnm
  bool firstPageOnly = false;                  ///< leave further pages alone
};

class VipsReader final : public PhotoReader {
 public:
  /// `memoryLimit`: bytes that a picture which is decoded whole may take.
  VipsReader(const VipsSourceFile& file, size_t memoryLimit);
  ~VipsReader() override;
  VipsReader(const VipsReader&) = delete;
  VipsReader& operator=(const VipsReader&) = delete;

  /// False also for libvips not being there, for several pages when not only the first is to be
  /// read, and for kinds of pictures that are not decoded here.
  bool ReadHeader() override;
  PictureSize FullSize() const override;
  const PhotoTraits& Traits() const override;
  bool Start(PictureSize needed) override;
  bool IsReduced() const override { return false; }
  int Width() const override;
  int Height() const override;
  int Channels() const override;
  size_t SampleSize() const override;
  bool ReadRow(uint8_t* row) override;
  void LeaveThread() override;
  const char* Error() const override;

 private:
  struct State;
  std::unique_ptr<State> state_;
};

}  // namespace vela
