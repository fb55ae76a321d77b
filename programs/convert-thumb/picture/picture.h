// A decoded picture.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace vela {

/// Rows from the top, pixels from the left, the samples of a pixel side by side: one, three or
/// four. Samples are finer than those of a JPEG: what one step rounds off, the quantisation of the
/// JPEG that is made at the end would make many times larger.
struct Picture {
  int width = 0;                  ///< pixels
  int height = 0;                 ///< pixels
  int channels = 0;               ///< 1, 3 or 4
  std::vector<uint16_t> samples;  ///< 0 to 65535

  Picture() = default;
  Picture(int pictureWidth, int pictureHeight, int pictureChannels)
      : width(pictureWidth),
        height(pictureHeight),
        channels(pictureChannels),
        samples(RowSize() * static_cast<size_t>(pictureHeight)) {}

  size_t RowSize() const { return static_cast<size_t>(width) * static_cast<size_t>(channels); }
  uint16_t* Row(int y) { return samples.data() + RowSize() * static_cast<size_t>(y); }
  const uint16_t* Row(int y) const { return samples.data() + RowSize() * static_cast<size_t>(y); }
};

constexpr float kBrightest = 65535;
/// A step of a JPEG's samples, which end at 255.
constexpr int kJpegStep = 257;

/// A value as the nearest sample, what lies outside of the range as its end.
inline uint16_t ToSample(float value) {
  const float rounded = value + 0.5F;
  return static_cast<uint16_t>(
      static_cast<int>(rounded < 0 ? 0 : (rounded > kBrightest ? kBrightest : rounded)));
}

}  // namespace vela
