#include "support/quadrants.h"

namespace vela_test {

std::string QuadrantPixels(int width, int height) {
  std::string pixels;
  pixels.reserve(static_cast<size_t>(width) * static_cast<size_t>(height) * 3);
  for (int y = 0; y < height; ++y) {
    for (int x = 0; x < width; ++x) {
      const size_t quadrant = (y * 2 >= height ? 2U : 0U) + (x * 2 >= width ? 1U : 0U);
      for (const uint8_t part : kNamedColours[quadrant].rgb) {
        pixels += static_cast<char>(part);
      }
    }
  }
  return pixels;
}

}  // namespace vela_test
