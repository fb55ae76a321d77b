// Keeps the rows that a vertical filter still needs.
#pragma once

#include <cstddef>
#include <vector>

#include "picture/resize_filter.h"
#include "picture/sample_loops.h"

namespace vela {

class RowWindow {
 public:
  /// `contributions`: of all rows of the result. `stride`: distance of rows in memory, samples.
  /// `atOnce`: number of rows that are written before the next one is filtered.
  RowWindow(const std::vector<Contribution>& contributions, size_t stride, size_t atOnce);

  /// Returns where row `y` of the picture is kept; `atOnce` rows starting at a multiple of it are
  /// contiguous.
  float* Row(int y) { return rows_.data() + Offset(y); }

  /// Writes the filtered row to `out`, which has room for `stride` samples.
  void Filter(const Contribution& contribution, float* out);

 private:
  size_t Offset(int y) const { return static_cast<size_t>(y) % count_ * stride_; }

  size_t stride_;
  size_t count_;
  std::vector<float> rows_;
  std::vector<WeightedRow> weighted_;
};

}  // namespace vela
