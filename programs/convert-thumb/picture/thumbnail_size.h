// How large a thumbnail is.
#pragma once

#include "command_line/conversion_plan.h"

namespace vela {

struct PictureSize {
  int width = 0;   ///< pixels
  int height = 0;  ///< pixels
};

/// The size of the thumbnail that a picture of `size` (both sides at least 1) gets in `box`: its
/// proportions kept, never more than `size`, never less than 1 pixel.
PictureSize ThumbnailSize(PictureSize size, const ThumbnailBox& box);

}  // namespace vela
