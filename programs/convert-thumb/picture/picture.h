// A decoded picture.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace vela {

struct PictureSize {
  int width = 0;   ///< pixels
  int height = 0;  ///< pixels
};

/// What the samples of a pixel mean.
enum class ColourSpace {
  kGrey,
  kRgb,
  kLumaChroma,  ///< brightness and two colour differences, with zero in the middle of their range
  kCmyk,        ///< cyan, magenta, yellow and black, each inverted: 0 is full ink
};

/// Returns true when a thumbnail can be stored in this space.
constexpr bool IsStorable(ColourSpace space) {
  return space == ColourSpace::kGrey || space == ColourSpace::kRgb;
}

/// Returns true when the colour profile of a picture in this space stays valid after the picture is
/// converted to RGB.
constexpr bool IsProfileValidInRgb(ColourSpace space) {
  return space == ColourSpace::kRgb;
}

/// Rows from the top, pixels from the left, the samples of a pixel (one, three or four) next to
/// each other. Samples are finer than those of a JPEG, because the quantisation of the JPEG that is
/// made at the end would amplify the rounding errors of each step.
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

  PictureSize Size() const { return {width, height}; }
  size_t RowSize() const { return static_cast<size_t>(width) * static_cast<size_t>(channels); }
  uint16_t* Row(int y) { return samples.data() + RowSize() * static_cast<size_t>(y); }
  const uint16_t* Row(int y) const { return samples.data() + RowSize() * static_cast<size_t>(y); }
};

/// The largest sample.
constexpr float kBrightest = 65535;
/// One step of a JPEG's 8-bit samples, in samples of a picture.
constexpr int kJpegStep = 257;

/// Returns the nearest sample; values out of range are clamped.
inline uint16_t ToSample(float value) {
  const float rounded = value + 0.5F;
  return static_cast<uint16_t>(
      static_cast<int>(rounded < 0 ? 0 : (rounded > kBrightest ? kBrightest : rounded)));
}

}  // namespace vela
