// Keeps the rows that a filter from top to bottom still needs.
#pragma once

#include <cstddef>
#include <vector>

#include "picture/resize_filter.h"
#include "picture/sample_loops.h"

namespace vela {

class RowWindow {
 public:
  /// `contributions`: to the rows that will be filtered. `stride`: of a row in memory, samples.
  /// `atOnce`: rows that are written before the next one is filtered.
  RowWindow(const std::vector<Contribution>& contributions, size_t stride, size_t atOnce);

  /// Where the row `y` of the picture is kept; `atOnce` rows from a multiple of it lie together.
  float* Row(int y) { return rows_.data() + Place(y); }

  /// Writes the filtered row to `out`, which has room for a stride.
  void Filter(const Contribution& contribution, float* out);

 private:
  size_t Place(int y) const { return static_cast<size_t>(y) % count_ * stride_; }

  size_t stride_;
  size_t count_;
  std::vector<float> rows_;
  std::vector<WeightedRow> weighted_;
};

}  // namespace vela
