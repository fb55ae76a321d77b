// A size as the image libraries give it.
#pragma once

#include <cstdint>

namespace vela {

/// Pixels, as stored; zero or less when there is no size.
struct PixelSize {
  int64_t width = 0;
  int64_t height = 0;
};

}  // namespace vela
