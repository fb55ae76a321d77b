// Tells how a TIFF stores its colours, which libvips does not.
#pragma once

#include "decoding/vips_library.h"

namespace vela {

enum class TiffColours {
  kUsual,    ///< read by libvips as they are
  kPalette,  ///< the same; each pixel is the number of a colour
  kUnusual,  ///< read otherwise, or not at all
};

/// Of the first picture in the file under `descriptor`, which reads from its start afterwards.
TiffColours ReadTiffColours(const VipsLibrary& vips, int descriptor);

}  // namespace vela
