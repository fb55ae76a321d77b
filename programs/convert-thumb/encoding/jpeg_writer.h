// Encodes a picture as JPEG.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "picture/photo_traits.h"
#include "picture/picture.h"
#include "picture/rows.h"
#include "picture/thumbnail_size.h"

namespace vela {

struct FreeEncoded {
  void operator()(unsigned char* memory) const { std::free(memory); }
};

/// An encoded file, or an error.
struct EncodedJpeg {
  std::unique_ptr<unsigned char, FreeEncoded> bytes;
  size_t size = 0;
  std::string error;  ///< message of the JPEG library; empty on success

  bool IsComplete() const { return bytes != nullptr; }
};

/// Encodes rows as they arrive. The chroma sampling is that of the photo, if a JPEG with
/// interleaved components can have it. A colour picture that contains only grey is stored as grey.
class JpegEncoder final : public RowSink {
 public:
  /// `channels`: 1 or 3. `traits`: of the photo; must outlive this object. `quality`: 1 to 100.
  /// `withProfile`: store the photo's colour profile.
  JpegEncoder(PictureSize size, int channels, const PhotoTraits& traits, int quality,
              bool withProfile);
  ~JpegEncoder() override;
  JpegEncoder(const JpegEncoder&) = delete;
  JpegEncoder& operator=(const JpegEncoder&) = delete;

  bool Put(const float* row) override;

  /// Returns why a row was rejected; empty if none was.
  std::string Error() const;

  /// Returns the file. Called after the last row.
  EncodedJpeg Finish();

  /// Returns the error when a row was rejected.
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
  std::vector<uint8_t> grey_;  ///< rows before the first that is not grey, one sample per pixel
  std::unique_ptr<Compressor> compressor_;  ///< created for the first row that is not grey
};

/// Encodes a whole picture; parameters as for JpegEncoder.
EncodedJpeg EncodeJpeg(const Picture& picture, const PhotoTraits& traits, int quality,
                       bool withProfile);

}  // namespace vela
