// What a photo carries beside its samples and hands on to the thumbnails.
#pragma once

#include <array>
#include <cstdint>
#include <vector>

#include "picture/colour_space.h"

namespace vela {

/// Sampling factors of a JPEG's component, 1 to 4.
struct JpegSampling {
  int horizontal = 1;
  int vertical = 1;
};

constexpr int kLargestDensity = 65535;

/// Density of the picture as a JPEG's header has it.
struct JpegDensity {
  int unit = 0;  ///< 0: proportions only, 1: per inch, 2: per centimetre
  int x = 1;
  int y = 1;
};

struct PhotoTraits {
  std::array<JpegSampling, 3> sampling;  ///< of a colour JPEG's components
  bool colour = false;                   ///< a JPEG of three components
  ColourSpace space = ColourSpace::kRgb;
  bool palette = false;      ///< pixels are numbers of colours, or of few greys
  bool transparent = false;  ///< has an alpha channel; its rows are delivered on their background
  JpegDensity density;
  int orientation = 1;                 ///< EXIF orientation, 1 to 8
  std::vector<uint8_t> colourProfile;  ///< ICC profile, empty when there is none
};

}  // namespace vela
