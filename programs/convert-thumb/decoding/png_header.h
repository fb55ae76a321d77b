// Reads what a PNG says in front of its samples and libvips does not hand on.
#pragma once

#include <optional>

#include "decoding/photo_traits.h"
#include "decoding/vips_library.h"

namespace vela {

struct PngHeader {
  int bitDepth = 8;
  bool linear = false;  ///< samples are said to be proportional to light
  JpegDensity density;
};

/// Of the file under `descriptor`; empty when it cannot be read. Leaves the place where the
/// descriptor reads alone.
std::optional<PngHeader> ReadPngHeader(const VipsLibrary& vips, int descriptor);

}  // namespace vela
