// Pixel size of a portable pixmap, the form in which raw photos are decoded whole.
#pragma once

#include "platform/standalone/pixel_size.h"

namespace vela {

/// Reads the header of the file at `path`; an empty size when it is no portable pixmap.
PixelSize ReadPpmSize(const char* path);

}  // namespace vela
