// Scales rows as they arrive, vertically before horizontally.
#pragma once

#include <cstddef>
#include <vector>

#include "picture/picture.h"
#include "picture/resize_plan.h"
#include "picture/row_block.h"
#include "picture/row_window.h"
#include "picture/rows.h"

namespace vela {

/// Samples are clamped after each direction, so at hard edges of full contrast the order of the
/// directions makes a difference. RowScaler, with the other order, is faster.
class ColumnScaler final : public RowSink {
 public:
  /// Scales a picture of size `from` with `channels` samples a pixel and passes the rows to `next`,
  /// which must outlive this object.
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
