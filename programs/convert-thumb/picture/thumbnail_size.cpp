#include "picture/thumbnail_size.h"

#include <algorithm>
#include <cmath>

namespace vela {

namespace {

int ScaledSide(int side, double scale) {
  return std::max(1, static_cast<int>(std::floor(scale * side + 0.5)));
}

}  // namespace

PictureSize ThumbnailSize(PictureSize size, const ThumbnailBox& box) {
  if (size.width == box.width && size.height == box.height) {
    return size;
  }
  const double horizontal = static_cast<double>(box.width) / size.width;
  const double vertical = static_cast<double>(box.height) / size.height;
  const double scale = box.fill ? std::max(horizontal, vertical) : std::min(horizontal, vertical);
  // Keeps the product within the range of int. Enlarged sides are cut to the old size below anyway.
  const double bounded = std::min(scale, 2.0);
  return {std::min(size.width, ScaledSide(size.width, bounded)),
          std::min(size.height, ScaledSide(size.height, bounded))};
}

}  // namespace vela
