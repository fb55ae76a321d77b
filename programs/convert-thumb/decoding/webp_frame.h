// Tells of an animated WebP's first frame what libvips does not.
#pragma once

#include "decoding/vips_library.h"

namespace vela {

enum class WebpFrame {
  kOpaque,
  kTransparent,
  kUnusual,  ///< not as large as the whole picture, or unreadable
};

/// The first frame of the file under `descriptor`, each frame of which says for itself whether it
/// has transparent parts. Leaves the place where the descriptor reads alone.
WebpFrame ReadFirstWebpFrame(const VipsLibrary& vips, int descriptor);

}  // namespace vela
