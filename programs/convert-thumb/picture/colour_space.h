// Which colour the samples of a pixel stand for.
#pragma once

namespace vela {

enum class ColourSpace {
  kGrey,
  kRgb,         ///< red, green, blue
  kLumaChroma,  ///< brightness and two colour differences, the middle of their range as zero
  kInks,        ///< cyan, magenta, yellow and black, each as the share of light that it leaves
};

/// Whether a thumbnail can be stored in this space.
constexpr bool IsStorable(ColourSpace space) {
  return space == ColourSpace::kGrey || space == ColourSpace::kRgb;
}

/// Whether a colour profile that a picture of this space has is still of use when the picture has
/// been converted to red, green and blue.
constexpr bool ProfileOutlivesConversion(ColourSpace space) {
  return space == ColourSpace::kRgb;
}

}  // namespace vela
