#include "picture/resize_plan.h"

namespace vela {

namespace {

constexpr double kPresampledArea = 0.1;
constexpr int kMinGrid = 128;

}  // namespace

bool IsPresampled(PictureSize from, PictureSize to) {
  const double horizontal = static_cast<double>(to.width) / from.width;
  const double vertical = static_cast<double>(to.height) / from.height;
  return horizontal * vertical <= kPresampledArea && kGridFactor * to.width >= kMinGrid &&
         kGridFactor * to.height >= kMinGrid;
}

bool IsScaledVerticallyFirst(PictureSize from, PictureSize to) {
  return static_cast<double>(to.width) / from.width <= static_cast<double>(to.height) / from.height;
}

std::vector<Contribution> ContributionsOf(int length, int newLength, const ResizePlan& plan) {
  return MakeContributions(length, newLength, plan.presample ? kGridFactor * newLength : 0,
                           plan.filter);
}

}  // namespace vela
