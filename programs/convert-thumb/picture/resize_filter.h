// How much each sample of a line adds to each sample of the scaled line.
#pragma once

#include <vector>

namespace vela {

/// Shape of the filter.
enum class FilterKind {
  kLanczos,   ///< sinc windowed by a sinc, three lobes
  kMitchell,  ///< cubic of Mitchell and Netravali
};

/// The samples that one scaled sample is made of.
struct Contribution {
  int first = 0;               ///< place of the first one
  std::vector<float> weights;  ///< from there on; their sum is 1

  int End() const { return first + static_cast<int>(weights.size()); }
};

/// Contributions to a line of `newLength` samples made from one of `length`, both at least 1. With
/// `grid` above 0 the line is first reduced or stretched to that many samples by taking the nearest
/// one, and the filter works on these.
std::vector<Contribution> MakeContributions(int length, int newLength, int grid, FilterKind kind);

}  // namespace vela
