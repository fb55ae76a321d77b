// The picture in the comparison's inputs.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace vela_test {

/// Samples from 0 to 65535, row by row, the channels of a pixel side by side.
struct Samples {
  int width = 0;
  int height = 0;
  int channels = 0;
  std::vector<uint16_t> values;
};

/// A picture like a photo: detail at every scale, sharp edges, grain; the same for the same size.
/// `channels`: 3, or 4 with soft and hard transparency.
Samples MakePhotoSamples(int width, int height, int channels = 3);

/// The samples as a PAM file of 16 bits, which keeps them all.
std::string PamOf(const Samples& samples);

}  // namespace vela_test
