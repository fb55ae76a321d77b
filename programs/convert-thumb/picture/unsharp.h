// Sharpens a picture.
#pragma once

#include <cstddef>
#include <vector>

#include "command_line/conversion_plan.h"
#include "picture/picture.h"
#include "picture/row_sink.h"
#include "picture/sample_loops.h"
#include "picture/thumbnail_size.h"

namespace vela {

/// Adds to every sample its difference from the blurred picture, as `mask` says.
void Sharpen(Picture& picture, const UnsharpMask& mask);

/// The same to rows as they come, which it passes on: each one when the last row that its blur
/// needs is there.
class RowSharpener final : public RowSink {
 public:
  /// `next` has to outlive this.
  RowSharpener(PictureSize size, int channels, const UnsharpMask& mask, RowSink& next);

  bool Put(const float* row) override;

  /// Bytes that sharpening a picture of that size takes besides the picture.
  static size_t Memory(PictureSize size, int channels, const UnsharpMask& mask);

 private:
  size_t RoomOfRow() const;
  float* Row(int y);
  float* Blurred(int y);
  void TakeRow(const float* row);
  void BlurRow(int y);
  bool FinishRow(int y);

  int height_;
  size_t channels_;
  float amount_;
  float threshold_;
  std::vector<float> kernel_;  ///< one side of the bell from its middle
  int reach_;
  size_t rowSize_;  ///< samples
  size_t stride_;   ///< of a blurred row in memory, samples
  size_t margin_;   ///< samples that a row is continued by to both sides
  int rowsHeld_;
  std::vector<float> rows_;
  std::vector<float> blurred_;  ///< from left to right
  std::vector<float> sum_;
  std::vector<float> sharpened_;
  std::vector<WeightedPair> pairs_;
  RowSink& next_;
  int read_ = 0;
  int made_ = 0;  ///< rows passed on
};

}  // namespace vela
