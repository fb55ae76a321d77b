// The picture in all test photos, and its colours.
#pragma once

#include <array>
#include <cstdint>
#include <string>

namespace vela_test {

/// A colour of the picture or one that it may turn into, with its letter.
struct NamedColour {
  char letter;
  std::array<uint8_t, 3> rgb;
};

constexpr std::array<NamedColour, 7> kNamedColours = {{{'R', {220, 20, 20}},
                                                       {'G', {20, 160, 20}},
                                                       {'B', {20, 20, 220}},
                                                       {'Y', {230, 220, 20}},
                                                       {'W', {255, 255, 255}},
                                                       {'K', {0, 0, 0}},
                                                       {'E', {128, 128, 128}}}};

/// The picture upright, row by row, three bytes a pixel: red and green above blue and yellow.
std::string QuadrantPixels(int width, int height);

}  // namespace vela_test
