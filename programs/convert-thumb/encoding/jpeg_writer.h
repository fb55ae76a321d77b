// Encodes a picture as JPEG.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "decoding/photo_traits.h"
#include "picture/picture.h"
#include "picture/row_sink.h"
#include "picture/thumbnail_size.h"

namespace vela {

struct FreeEncoded {
  void operator()(unsigned char* memory) const { std::free(memory); }
};

/// The bytes of a file, or why there are none.
struct EncodedJpeg {
  std::unique_ptr<unsigned char, FreeEncoded> bytes;
  size_t size = 0;
  std::string error;  ///< in the JPEG library's words; empty when there are bytes

  bool IsComplete() const { return bytes != nullptr; }
};

/// Encodes rows as they come. Colour is stored as finely as in the photo that `traits` are of,
/// where a JPEG with its components together can be; a colour picture without any colour is stored
/// as grey. The colour profile goes along when `withProfile`.
class JpegEncoder final : public RowSink {
 public:
  /// `channels`: 1 or 3. `quality`: 1 to 100. `traits` have to outlive this.
  JpegEncoder(PictureSize size, int channels, const PhotoTraits& traits, int quality,
              bool withProfile);
  ~JpegEncoder() override;
  JpegEncoder(const JpegEncoder&) = delete;
  JpegEncoder& operator=(const JpegEncoder&) = delete;

  bool Put(const float* row) override;

  /// Why a row was refused; empty when none was.
  std::string Error() const;

  /// The file, after the last row.
  EncodedJpeg Finish();

  /// What there is instead of a file when a row was refused.
  EncodedJpeg Failure() const;

 private:
  class Compressor;

  void KeepGreyRow(const float* row);
  bool Start(int channels);
  bool WriteGreyRows();
  bool WriteRow();

  PictureSize size_;
  int channels_;
  const PhotoTraits& traits_;
  int quality_;
  bool withProfile_;
  std::vector<uint8_t> row_;   ///< to be written
  std::vector<uint8_t> grey_;  ///< rows before the first that is not grey, a sample a pixel
  std::unique_ptr<Compressor> compressor_;  ///< from that row on
};

/// Encodes a whole picture.
EncodedJpeg EncodeJpeg(const Picture& picture, const PhotoTraits& traits, int quality,
                       bool withProfile);

}  // namespace vela
