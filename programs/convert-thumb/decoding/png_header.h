// Properties of a PNG that libvips does not report.
#pragma once

#include <optional>

#include "decoding/vips_library.h"
#include "picture/photo_traits.h"

namespace vela {

struct PngHeader {
  int bitDepth = 8;
  bool linear = false;  ///< samples are declared proportional to light
  JpegDensity density;
};

/// Reads the chunks before the samples; empty when that fails. Does not change the descriptor's
/// position.
std::optional<PngHeader> ReadPngHeader(const VipsLibrary& vips, int descriptor);

}  // namespace vela
