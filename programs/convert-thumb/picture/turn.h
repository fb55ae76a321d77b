// Turns and mirrors pictures.
#pragma once

#include "picture/picture.h"

namespace vela {

/// Turns the picture clockwise by `quarterTurns` times 90 degrees.
void Turn(Picture& picture, int quarterTurns);

/// Turns and mirrors a picture that was taken with this EXIF orientation (2 to 8) so that it stands
/// upright; leaves it alone for any other value.
void Straighten(Picture& picture, int orientation);

}  // namespace vela
