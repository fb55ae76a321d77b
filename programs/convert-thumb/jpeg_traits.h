// What a JPEG carries beside its picture and hands on to the thumbnails.
#pragma once

#include <array>
#include <cstdint>
#include <vector>

/// Sampling factors of a component, 1 to 4.
struct JpegSampling {
  int horizontal = 1;
  int vertical = 1;
};

/// Density of the picture as the file header has it.
struct JpegDensity {
  int unit = 0;  ///< 0: proportions only, 1: per inch, 2: per centimetre
  int x = 1;
  int y = 1;
};

struct JpegTraits {
  std::array<JpegSampling, 3> sampling;  ///< of a colour picture's components
  bool colour = false;                   ///< three components
  JpegDensity density;
  int orientation = 1;                 ///< EXIF orientation, 1 to 8
  std::vector<uint8_t> colourProfile;  ///< ICC profile, empty when there is none
};
