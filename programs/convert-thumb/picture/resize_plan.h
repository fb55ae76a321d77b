// How a picture is scaled.
#pragma once

#include <vector>

#include "picture/picture.h"
#include "picture/resize_filter.h"

namespace vela {

/// How to scale.
struct ResizePlan {
  PictureSize size;  ///< of the result, both sides at least 1
  FilterKind filter = FilterKind::kLanczos;
  bool columnsFirst = false;  ///< vertically before horizontally, see ColumnScaler
  bool presample = false;  ///< first take the nearest sample on a grid of kGridFactor times `size`
};

constexpr int kGridFactor = 5;

/// Returns true when a picture that is reduced from `from` to `to` is presampled first: when it
/// shrinks by much, and not to a size so small that the loss would be visible.
bool IsPresampled(PictureSize from, PictureSize to);

/// Returns true when ImageMagick scales such a picture vertically before it scales it horizontally.
bool IsScaledVerticallyFirst(PictureSize from, PictureSize to);

/// Returns the filter weights of a row or column of `length` samples that is scaled to `newLength`.
std::vector<Contribution> ContributionsOf(int length, int newLength, const ResizePlan& plan);

}  // namespace vela
