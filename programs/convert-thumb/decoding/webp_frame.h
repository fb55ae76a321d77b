// Properties of the first frame of an animated WebP that libvips does not report.
#pragma once

#include "decoding/vips_library.h"

namespace vela {

enum class WebpFrame {
  kOpaque,
  kTransparent,
  kUnsupported,  ///< smaller than the picture, or unreadable
};

/// Examines the first frame of the file; every frame has its own transparency. Does not change the
/// descriptor's position.
WebpFrame ReadFirstWebpFrame(const VipsLibrary& vips, int descriptor);

}  // namespace vela
