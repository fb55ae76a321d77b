#include "picture/turn.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <utility>

namespace vela {

namespace {

void MirrorRow(uint16_t* row, int width, size_t channels) {
  uint16_t* left = row;
  uint16_t* right = row + static_cast<size_t>(width - 1) * channels;
  for (; left < right; left += channels, right -= channels) {
    std::swap_ranges(left, left + channels, right);
  }
}

void MirrorLeftRight(Picture& picture) {
  for (int y = 0; y < picture.height; ++y) {
    MirrorRow(picture.Row(y), picture.width, static_cast<size_t>(picture.channels));
  }
}

void MirrorTopBottom(Picture& picture) {
  for (int top = 0, bottom = picture.height - 1; top < bottom; ++top, --bottom) {
    std::swap_ranges(picture.Row(top), picture.Row(top) + picture.RowSize(), picture.Row(bottom));
  }
}

/// Swaps rows and columns.
void Transpose(Picture& picture) {
  Picture turned(picture.height, picture.width, picture.channels);
  const size_t channels = static_cast<size_t>(picture.channels);
  for (int y = 0; y < picture.height; ++y) {
    const uint16_t* from = picture.Row(y);
    uint16_t* to = turned.samples.data() + static_cast<size_t>(y) * channels;
    for (int x = 0; x < picture.width; ++x) {
      std::copy_n(from, channels, to);
      from += channels;
      to += turned.RowSize();
    }
  }
  picture = std::move(turned);
}

/// Every rotation or mirroring is an optional transposition followed by optional mirroring in each
/// direction.
struct Transformation {
  bool transpose;
  bool leftRight;
  bool topBottom;
};

void Apply(Picture& picture, const Transformation& transformation) {
  if (transformation.transpose) {
    Transpose(picture);
  }
  if (transformation.leftRight) {
    MirrorLeftRight(picture);
  }
  if (transformation.topBottom) {
    MirrorTopBottom(picture);
  }
}

constexpr std::array<Transformation, 4> kTurns = {
    {{false, false, false}, {true, true, false}, {false, true, true}, {true, false, true}}};

constexpr int kMinOrientation = 1;
constexpr std::array<Transformation, 8> kOrientations = {{{false, false, false},
                                                          {false, true, false},
                                                          {false, true, true},
                                                          {false, false, true},
                                                          {true, false, false},
                                                          {true, true, false},
                                                          {true, true, true},
                                                          {true, false, true}}};

}  // namespace

void Turn(Picture& picture, int quarterTurns) {
  Apply(picture, kTurns[static_cast<size_t>(quarterTurns)]);
}

void ApplyOrientation(Picture& picture, int orientation) {
  const int index = orientation - kMinOrientation;
  if (index >= 0 && index < static_cast<int>(kOrientations.size())) {
    Apply(picture, kOrientations[static_cast<size_t>(index)]);
  }
}

}  // namespace vela
