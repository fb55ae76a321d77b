// Which colour the samples of a pixel stand for.
#pragma once

enum class ColourSpace {
  kGrey,
  kRgb,         ///< red, green, blue
  kLumaChroma,  ///< brightness and two colour differences, the middle of their range as zero
  kInks,        ///< cyan, magenta, yellow and black, each as the share of light that it leaves
};
