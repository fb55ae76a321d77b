// Tells ImageMagick how much it may use.
#pragma once

#include <cstddef>

namespace vela {

/// Puts limits into the environment that let ImageMagick keep a picture in files, instead of
/// failing for want of memory, well before it takes `memoryLimit` bytes. Lower ones stay.
void LimitImageMagick(size_t memoryLimit);

}  // namespace vela
