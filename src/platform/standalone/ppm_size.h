// Pixel size of a portable pixmap, the format of fully decoded raw photos.
#pragma once

#include <cstdint>

namespace vela {

/// A size in pixels, as stored; zero or less when there is none.
struct PixelSize {
  int64_t width = 0;
  int64_t height = 0;
};

/// Reads the header of the file at `path`; returns an empty size when it is not a portable pixmap.
PixelSize ReadPpmSize(const char* path);

}  // namespace vela
