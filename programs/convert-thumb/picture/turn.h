// Rotates and mirrors pictures.
#pragma once

#include "picture/picture.h"

namespace vela {

/// Rotates the picture clockwise by `quarterTurns` (0 to 3) times 90 degrees.
void Turn(Picture& picture, int quarterTurns);

/// Rotates and mirrors a picture with this EXIF orientation (2 to 8) so that it is upright; does
/// nothing for any other value.
void ApplyOrientation(Picture& picture, int orientation);

}  // namespace vela
