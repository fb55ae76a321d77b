// Collects rows that are scaled together.
#pragma once

#include <algorithm>
#include <cstddef>
#include <utility>
#include <vector>

#include "picture/sample_loops.h"

namespace vela {

/// Interleaves up to kBlockRows rows, so that vector instructions work on all of them at once.
class RowBlock {
 public:
  /// `rowSize`: samples in a row. `height`: rows of the picture.
  RowBlock(size_t rowSize, int height)
      : rowSize_(rowSize),
        stride_(PaddedSize(rowSize)),
        rowsLeft_(height),
        rows_(stride_ * kBlockRows),
        lanes_(stride_ * kBlockRows) {}

  /// Returns where to write the next row before TakeRow is called.
  float* NextRow() { return rows_.data() + static_cast<size_t>(filled_) * stride_; }

  /// Adds that row. Returns the number of rows in the block when it is full or has reached the end
  /// of the picture, otherwise 0.
  int TakeRow() {
    ++filled_;
    --rowsLeft_;
    if (filled_ < static_cast<int>(kBlockRows) && rowsLeft_ > 0) {
      return 0;
    }
    RowsToLanes(rows_.data(), stride_, lanes_.data());
    return std::exchange(filled_, 0);
  }

  /// Adds a copy of `row`; returns the same as TakeRow.
  int Put(const float* row) {
    std::copy_n(row, rowSize_, NextRow());
    return TakeRow();
  }

  /// Returns the full block: sample by sample, that sample of every row.
  const float* Lanes() const { return lanes_.data(); }

 private:
  size_t rowSize_;
  size_t stride_;  ///< of a row in memory, samples
  int rowsLeft_;
  int filled_ = 0;
  std::vector<float> rows_;
  std::vector<float> lanes_;
};

}  // namespace vela
