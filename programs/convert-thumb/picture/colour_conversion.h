// Converts between colour spaces.
#pragma once

#include <cstddef>
#include <cstdint>

#include "picture/picture.h"

namespace vela {

/// Converts a picture in the space `from` to RGB; does nothing for grey and RGB. CMYK is converted
/// without a colour profile, as if the inks were ideal.
void ConvertToRgb(Picture& picture, ColourSpace from);

/// Converts `pixels` pixels of brightness and two colour differences to RGB.
void LumaChromaToRgb(uint16_t* samples, size_t pixels);

/// Writes the brightness and the two colour differences of a colour (each from 0 to kBrightest) to
/// `out`. Like ImageMagick, this function writes the neutral value of the differences as step 128
/// of 256, half a step above the middle of the range that LumaChromaToRgb uses.
void RgbToLumaChroma(float red, float green, float blue, uint16_t* out);

}  // namespace vela
