#include "picture/row_scaler.h"

namespace vela {

BlockScaler::BlockScaler(PictureSize from, int channels, const ResizePlan& plan, RowSink& next)
    : channels_(channels),
      columns_(ContributionsOf(from.width, plan.size.width, plan)),
      rows_(ContributionsOf(from.height, plan.size.height, plan)),
      stride_(PaddedSize(static_cast<size_t>(plan.size.width) * static_cast<size_t>(channels))),
      window_(rows_, stride_, kBlockRows),
      scaledLanes_(stride_ * kBlockRows),
      result_(stride_),
      next_(next) {}

bool BlockScaler::Put(const float* lanes, int rows) {
  FilterLanes(columns_, lanes, channels_, scaledLanes_.data());
  LanesToRows(scaledLanes_.data(), stride_, window_.Row(read_));
  read_ += rows;
  for (; made_ < rows_.size() && rows_[made_].End() <= read_; ++made_) {
    window_.Filter(rows_[made_], result_.data());
    if (!next_.Put(result_.data())) {
      return false;
    }
  }
  return true;
}

RowScaler::RowScaler(PictureSize from, int channels, const ResizePlan& plan, RowSink& next)
    : block_(static_cast<size_t>(from.width) * static_cast<size_t>(channels), from.height),
      scaler_(from, channels, plan, next) {}

}  // namespace vela
