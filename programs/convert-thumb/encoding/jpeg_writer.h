// Encodes a picture as JPEG.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <optional>
#include <vector>

#include "decoding/photo_traits.h"
#include "picture/picture.h"
#include "picture/row_sink.h"
#include "picture/thumbnail_size.h"

struct FreeEncoded {
  void operator()(unsigned char* memory) const { std::free(memory); }
};

/// The bytes of a file.
struct EncodedJpeg {
  std::unique_ptr<unsigned char, FreeEncoded> bytes;
  size_t size = 0;
};

/// Encodes rows as they come. Colour is stored as finely as in the photo that `traits` are of; a
/// colour picture without any colour is stored as grey. The colour profile goes along when
/// `withProfile`.
class JpegEncoder final : public RowSink {
 public:
  /// `channels`: 1 or 3. `quality`: 1 to 100. `traits` have to outlive this.
  JpegEncoder(PictureSize size, int channels, const PhotoTraits& traits, int quality,
              bool withProfile);
  ~JpegEncoder() override;
  JpegEncoder(const JpegEncoder&) = delete;
  JpegEncoder& operator=(const JpegEncoder&) = delete;

  bool Put(const float* row) override;

  /// The file, after the last row; empty when memory runs out.
  std::optional<EncodedJpeg> Finish();

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
std::optional<EncodedJpeg> EncodeJpeg(const Picture& picture, const PhotoTraits& traits,
                                      int quality, bool withProfile);
