// How a TIFF stores its colours, which libvips does not report.
#pragma once

#include "decoding/vips_library.h"

namespace vela {

enum class TiffColours {
  kSupported,    ///< libvips reads them unchanged
  kPalette,      ///< the same; each pixel is an index into a palette
  kUnsupported,  ///< libvips converts them or cannot read them
};

/// Examines the first picture in the file. Sets the descriptor's position to the start of the file.
TiffColours ReadTiffColours(const VipsLibrary& vips, int descriptor);

}  // namespace vela
