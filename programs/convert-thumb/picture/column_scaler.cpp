#include "picture/column_scaler.h"

#include <algorithm>

#include "picture/sample_loops.h"

namespace vela {

ColumnScaler::ColumnScaler(PictureSize from, int channels, const ResizePlan& plan, RowSink& next)
    : channels_(channels),
      rowSize_(static_cast<size_t>(from.width) * static_cast<size_t>(channels)),
      columns_(ContributionsOf(from.width, plan.size.width, plan)),
      rows_(ContributionsOf(from.height, plan.size.height, plan)),
      window_(rows_, PaddedSize(rowSize_), 1),
      block_(rowSize_, plan.size.height),
      resultStride_(
          PaddedSize(static_cast<size_t>(plan.size.width) * static_cast<size_t>(channels))),
      scaledLanes_(resultStride_ * kBlockRows),
      result_(resultStride_ * kBlockRows),
      next_(next) {}

bool ColumnScaler::Put(const float* row) {
  std::copy_n(row, rowSize_, window_.Row(read_++));
  for (; made_ < rows_.size() && rows_[made_].End() <= read_; ++made_) {
    window_.Filter(rows_[made_], block_.NextRow());
    if (!PutBlock(block_.TakeRow())) {
      return false;
    }
  }
  return true;
}

bool ColumnScaler::PutBlock(int rows) {
  if (rows == 0) {
    return true;
  }
  FilterLanes(columns_, block_.Lanes(), channels_, scaledLanes_.data());
  LanesToRows(scaledLanes_.data(), resultStride_, result_.data());
  for (int row = 0; row < rows; ++row) {
    if (!next_.Put(result_.data() + static_cast<size_t>(row) * resultStride_)) {
      return false;
    }
  }
  return true;
}

}  // namespace vela
