// Sharpens a picture.
#pragma once

#include <cstddef>
#include <vector>

#include "configuration/profile_values.h"
#include "picture/picture.h"
#include "picture/rows.h"
#include "picture/sample_loops.h"

namespace vela {

/// Adds to every sample its difference from the blurred picture, according to `mask`.
void Sharpen(Picture& picture, const UnsharpMask& mask);

/// The same for rows as they arrive: each is passed on as soon as the last row that its blur needs
/// has arrived.
class RowSharpener final : public RowSink {
 public:
  /// `next` must outlive this object.
  RowSharpener(PictureSize size, int channels, const UnsharpMask& mask, RowSink& next);

  bool Put(const float* row) override;

  /// Returns the bytes that sharpening a picture of that size needs in addition to the picture.
  static size_t Memory(PictureSize size, int channels, const UnsharpMask& mask);

 private:
  size_t PaddedRowSize() const;
  float* Row(int y);
  float* Blurred(int y);
  void StoreRow(const float* row);
  void BlurRow(int y);
  bool FinishRow(int y);

  int height_;
  size_t channels_;
  float amount_;
  float threshold_;
  std::vector<float> kernel_;  ///< one half of the Gaussian, starting at its centre
  int reach_;
  size_t rowSize_;  ///< samples
  size_t stride_;   ///< distance of blurred rows in memory, samples
  size_t margin_;   ///< samples that a row is extended by on both sides
  int rowsHeld_;
  std::vector<float> rows_;
  std::vector<float> blurred_;  ///< horizontally
  std::vector<float> sum_;
  std::vector<float> sharpened_;
  std::vector<WeightedPair> pairs_;
  RowSink& next_;
  int read_ = 0;
  int done_ = 0;  ///< rows passed on
};

}  // namespace vela
