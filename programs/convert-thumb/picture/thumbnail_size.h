// The size of a thumbnail.
#pragma once

#include "picture/picture.h"

namespace vela {

/// The box that a thumbnail is scaled to; a smaller picture keeps its size.
struct ThumbnailBox {
  int width = 0;      ///< pixels, at least 1
  int height = 0;     ///< pixels, at least 1
  bool fill = false;  ///< the box is a minimum for both sides, not a maximum
};

/// Returns the size of the thumbnail of a picture of `size` (both sides at least 1) in `box`: with
/// the same proportions, never larger than `size`, and at least 1 pixel on each side.
PictureSize ThumbnailSize(PictureSize size, const ThumbnailBox& box);

}  // namespace vela
