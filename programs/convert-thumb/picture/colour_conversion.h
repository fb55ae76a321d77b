// Converts between colour spaces.
#pragma once

#include <cstddef>
#include <cstdint>

#include "picture/colour_space.h"
#include "picture/picture.h"

namespace vela {

/// Makes red, green and blue of a picture in the space `from`; leaves grey and red, green and blue
/// as they are. Inks are taken for ideal ones.
void ConvertToRgb(Picture& picture, ColourSpace from);

/// Makes red, green and blue of `pixels` times brightness and both colour differences.
void LumaChromaToRgb(uint16_t* samples, size_t pixels);

/// Writes brightness and both colour differences of a colour (each from 0 to kBrightest) to `out`.
/// ImageMagick reads the middle of the differences' 256 steps, 128, as half a step more than the
/// middle of the range, and so is this pair of conversions.
void RgbToLumaChroma(float red, float green, float blue, uint16_t* out);

}  // namespace vela
