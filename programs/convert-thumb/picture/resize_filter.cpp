#include "picture/resize_filter.h"

#include <algorithm>
#include <cmath>

namespace vela {

namespace {

constexpr double kPi = 3.14159265358979323846;
constexpr double kTiny = 1e-12;
constexpr double kLanczosLobes = 3;
constexpr double kMitchellSupport = 2;

double Sinc(double x) {
  return x == 0 ? 1 : std::sin(kPi * x) / (kPi * x);
}

double Lanczos(double x) {
  return x < kLanczosLobes ? Sinc(x) * Sinc(x / kLanczosLobes) : 0;
}

double Mitchell(double x) {
  if (x < 1) {
    return (16 + x * x * (21 * x - 36)) / 18;
  }
  return x < 2 ? (32 + x * (-60 + x * (36 - 7 * x))) / 18 : 0;
}

double Weight(FilterKind kind, double distance) {
  return kind == FilterKind::kLanczos ? Lanczos(std::fabs(distance))
                                      : Mitchell(std::fabs(distance));
}

double Support(FilterKind kind) {
  return kind == FilterKind::kLanczos ? kLanczosLobes : kMitchellSupport;
}

/// Returns the index of the sample that is nearest to a point of the grid.
int NearestSample(int point, int grid, int length) {
  return static_cast<int>((point + 0.5 - kTiny) * length / grid);
}

/// The filter of one scaled sample, centred over the samples it is computed from.
struct Window {
  double centre = 0;
  double scale = 1;
  int first = 0;
  int end = 0;
};

Window WindowOf(int index, double factor, int length, FilterKind kind) {
  Window window;
  window.scale = std::max(1 / factor + kTiny, 1.0);
  window.centre = (index + 0.5) / factor + kTiny;
  const double reach = window.scale * Support(kind);
  window.first = static_cast<int>(std::max(window.centre - reach + 0.5, 0.0));
  window.end = static_cast<int>(std::min<double>(window.centre + reach + 0.5, length));
  return window;
}

Contribution ContributionOf(const Window& window, int length, int grid, FilterKind kind) {
  const auto source = [&](int index) {
    return grid > 0 ? NearestSample(index, grid, length) : index;
  };
  Contribution contribution;
  contribution.first = source(window.first);
  std::vector<double> weights(static_cast<size_t>(source(window.end - 1) - contribution.first + 1));
  double sum = 0;
  for (int index = window.first; index < window.end; ++index) {
    const double weight = Weight(kind, (index - window.centre + 0.5) / window.scale);
    weights[static_cast<size_t>(source(index) - contribution.first)] += weight;
    sum += weight;
  }
  contribution.weights.reserve(weights.size());
  for (const double weight : weights) {
    contribution.weights.push_back(static_cast<float>(weight / sum));
  }
  return contribution;
}

}  // namespace

std::vector<Contribution> MakeContributions(int length, int newLength, int grid, FilterKind kind) {
  const int filtered = grid > 0 ? grid : length;
  const double factor = static_cast<double>(newLength) / filtered;
  std::vector<Contribution> contributions;
  contributions.reserve(static_cast<size_t>(newLength));
  for (int index = 0; index < newLength; ++index) {
    contributions.push_back(
        ContributionOf(WindowOf(index, factor, filtered, kind), length, grid, kind));
  }
  return contributions;
}

}  // namespace vela
