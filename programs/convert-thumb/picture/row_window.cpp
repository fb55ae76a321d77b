#include "picture/row_window.h"

#include <algorithm>

namespace vela {

namespace {

size_t LongestContribution(const std::vector<Contribution>& contributions) {
  size_t longest = 0;
  for (const Contribution& contribution : contributions) {
    longest = std::max(longest, contribution.weights.size());
  }
  return longest;
}

/// The next rows are written while the filter still needs all rows before them.
size_t WindowRows(const std::vector<Contribution>& contributions, size_t atOnce) {
  return (LongestContribution(contributions) / atOnce + 2) * atOnce;
}

}  // namespace

RowWindow::RowWindow(const std::vector<Contribution>& contributions, size_t stride, size_t atOnce)
    : stride_(stride), count_(WindowRows(contributions, atOnce)), rows_(stride_ * count_) {}

void RowWindow::Filter(const Contribution& contribution, float* out) {
  weighted_.clear();
  for (size_t i = 0; i < contribution.weights.size(); ++i) {
    // A presampled picture skips most rows.
    if (contribution.weights[i] != 0) {
      weighted_.push_back({Row(contribution.first + static_cast<int>(i)), contribution.weights[i]});
    }
  }
  SumRows(weighted_.data(), weighted_.size(), out, stride_);
}

}  // namespace vela
