// Scales rows as they come: first from top to bottom, then from left to right.
#pragma once

#include <cstddef>
#include <vector>

#include "picture/resize.h"
#include "picture/resize_filter.h"
#include "picture/row_block.h"
#include "picture/row_sink.h"
#include "picture/row_window.h"
#include "picture/thumbnail_size.h"

namespace vela {

/// Where overshoot is cut between the two directions, it shows which of them comes first: at hard
/// edges of full contrast. RowScaler, with the other order, is faster.
class ColumnScaler final : public RowSink {
 public:
  /// Scales a picture of size `from` with `channels` samples a pixel. `next`, which has to outlive
  /// this, gets the rows.
  ColumnScaler(PictureSize from, int channels, const ResizePlan& plan, RowSink& next);

  bool Put(const float* row) override;

 private:
  bool PutBlock(int rows);

  int channels_;
  size_t rowSize_;
  std::vector<Contribution> columns_;
  std::vector<Contribution> rows_;
  RowWindow window_;
  RowBlock block_;
  size_t resultStride_;
  std::vector<float> scaledLanes_;
  std::vector<float> result_;
  RowSink& next_;
  int read_ = 0;
  size_t made_ = 0;
};

}  // namespace vela
