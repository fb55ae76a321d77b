// The filter weights of scaling a row or column.
#pragma once

#include <vector>

namespace vela {

/// Shape of a filter.
enum class FilterKind {
  kLanczos,   ///< sinc windowed by a sinc, three lobes
  kMitchell,  ///< the Mitchell-Netravali cubic
};

/// The source samples that one scaled sample is computed from.
struct Contribution {
  int first = 0;               ///< index of the first one
  std::vector<float> weights;  ///< of that one and those after it; their sum is 1

  int End() const { return first + static_cast<int>(weights.size()); }
};

/// Returns the contributions to each of `newLength` samples that a row or column of `length`
/// samples is scaled to, both at least 1. If `grid` is positive, the filter is applied to that many
/// nearest samples instead of all of them.
std::vector<Contribution> MakeContributions(int length, int newLength, int grid, FilterKind kind);

}  // namespace vela
