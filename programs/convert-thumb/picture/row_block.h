// Gathers rows to be scaled together.
#pragma once

#include <algorithm>
#include <cstddef>
#include <utility>
#include <vector>

#include "picture/sample_loops.h"

namespace vela {

class RowBlock {
 public:
  /// For the rows of a picture `height` rows high; `rowSize`: samples a row.
  RowBlock(size_t rowSize, int height)
      : rowSize_(rowSize),
        stride_(PaddedSize(rowSize)),
        rowsLeft_(height),
        rows_(stride_ * kBlockRows),
        lanes_(stride_ * kBlockRows) {}

  /// Where the next row is to be written.
  float* NextRow() { return rows_.data() + static_cast<size_t>(filled_) * stride_; }

  /// Takes that row. Returns how many rows the block has when it is full or its last row was the
  /// picture's last; else 0.
  int TakeRow() {
    ++filled_;
    --rowsLeft_;
    if (filled_ < static_cast<int>(kBlockRows) && rowsLeft_ > 0) {
      return 0;
    }
    RowsToLanes(rows_.data(), stride_, lanes_.data());
    return std::exchange(filled_, 0);
  }

  int Put(const float* row) {
    std::copy_n(row, rowSize_, NextRow());
    return TakeRow();
  }

  /// The full block, the samples of one place side by side.
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
