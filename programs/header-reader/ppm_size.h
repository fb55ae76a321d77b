// Pixel size of a portable pixmap, the format of fully decoded raw photos.
#pragma once

#include <cstdint>
#include <cstdio>

namespace vela {

/// A size in pixels, as stored; zero or less when there is none.
struct PixelSize {
  int64_t width = 0;
  int64_t height = 0;
};

/// Reads the header of `file`; returns an empty size when it is not a portable pixmap.
PixelSize ReadPpmSize(FILE* file);

}  // namespace vela
