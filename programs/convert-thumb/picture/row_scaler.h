// Scales rows as they come and passes the scaled rows on.
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

/// Scales blocks of rows: first from left to right, then from top to bottom.
class BlockScaler {
 public:
  /// Scales a picture of size `from` with `channels` samples a pixel. `next`, which has to outlive
  /// this, gets the rows.
  BlockScaler(PictureSize from, int channels, const ResizePlan& plan, RowSink& next);

  /// Takes the next `rows` rows, whose samples of one place lie side by side. False when `next`
  /// refuses a row.
  bool Put(const float* lanes, int rows);

 private:
  int channels_;
  std::vector<Contribution> columns_;
  std::vector<Contribution> rows_;
  size_t stride_;  ///< of a scaled row in memory, samples
  RowWindow window_;
  std::vector<float> scaledLanes_;
  std::vector<float> result_;
  RowSink& next_;
  int read_ = 0;
  size_t made_ = 0;
};

/// Scales the rows of a picture, one after another.
class RowScaler {
 public:
  /// The same as BlockScaler's.
  RowScaler(PictureSize from, int channels, const ResizePlan& plan, RowSink& next);

  /// Where the next row may be written, to be taken by TakeRow.
  float* NextRow() { return block_.NextRow(); }
  bool TakeRow() {
    const int rows = block_.TakeRow();
    return rows == 0 || scaler_.Put(block_.Lanes(), rows);
  }

 private:
  RowBlock block_;
  BlockScaler scaler_;
};

}  // namespace vela
