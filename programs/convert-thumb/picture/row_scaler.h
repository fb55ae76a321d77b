// Scales rows as they arrive, horizontally before vertically.
#pragma once

#include <cstddef>
#include <vector>

#include "picture/picture.h"
#include "picture/resize_plan.h"
#include "picture/row_block.h"
#include "picture/row_window.h"
#include "picture/rows.h"

namespace vela {

/// Scales blocks of rows.
class BlockScaler {
 public:
  /// Scales a picture of size `from` with `channels` samples a pixel and passes the rows to `next`,
  /// which must outlive this object.
  BlockScaler(PictureSize from, int channels, const ResizePlan& plan, RowSink& next);

  /// Takes the next `rows` rows, interleaved by RowBlock. Returns false when `next` rejects a row.
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
  /// Parameters as for BlockScaler.
  RowScaler(PictureSize from, int channels, const ResizePlan& plan, RowSink& next);

  /// Returns where to write the next row before TakeRow is called.
  float* NextRow() { return block_.NextRow(); }
  /// Processes that row. Returns false when the next step rejects a row.
  bool TakeRow() {
    const int rows = block_.TakeRow();
    return rows == 0 || scaler_.Put(block_.Lanes(), rows);
  }

 private:
  RowBlock block_;
  BlockScaler scaler_;
};

}  // namespace vela
