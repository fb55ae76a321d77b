// Decodes photos of most formats with libvips.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>

#include "decoding/photo_reader.h"
#include "picture/photo_format.h"

namespace vela {

/// The file that VipsReader reads.
struct VipsSourceFile {
  int descriptor = -1;                         ///< must stay open while the reader is used
  PhotoFormat format = PhotoFormat::kUnknown;  ///< anything but kJpeg and kPnm
  bool firstPageOnly = false;                  ///< ignore further pages
};

class VipsReader final : public PhotoReader {
 public:
  /// `memoryLimit`: bytes available for a picture that cannot be decoded row by row.
  VipsReader(const VipsSourceFile& file, size_t memoryLimit);
  ~VipsReader() override;
  VipsReader(const VipsReader&) = delete;
  VipsReader& operator=(const VipsReader&) = delete;

  /// Returns false also without libvips, for several pages that are not ignored, and for
  /// unsupported kinds of pictures.
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
