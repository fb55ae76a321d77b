// Properties of a photo, besides its samples, that affect its thumbnails.
#pragma once

#include <array>
#include <cstdint>
#include <vector>

#include "picture/picture.h"

namespace vela {

/// Sampling factors of a JPEG component, 1 to 4.
struct JpegSampling {
  int horizontal = 1;
  int vertical = 1;
};

constexpr int kMaxDensity = 65535;

/// Density of the picture as in a JPEG header.
struct JpegDensity {
  int unit = 0;  ///< 0: proportions only, 1: per inch, 2: per centimetre
  int x = 1;
  int y = 1;
};

struct PhotoTraits {
  std::array<JpegSampling, 3> sampling;  ///< of a colour JPEG's components
  bool colour = false;                   ///< a JPEG with three components
  ColourSpace space = ColourSpace::kRgb;
  bool palette = false;      ///< pixels are indices into a palette, or a few grey levels
  bool transparent = false;  ///< has an alpha channel, already blended with the background
  JpegDensity density;
  int orientation = 1;                 ///< EXIF orientation, 1 to 8
  std::vector<uint8_t> colourProfile;  ///< ICC profile; empty if the photo has none
};

}  // namespace vela
