// Converts rows as a decoder delivers them to rows of a photo.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

namespace vela {

/// How a decoder's row is converted.
enum class RowChange {
  kNone,
  kOnBackground,       ///< blend with the background; the last sample of each pixel is its opacity
  kInvert,             ///< CMYK as amounts of ink to ColourSpace::kCmyk
  kLumaChroma,         ///< RGB to brightness and colour differences
  kThroughLumaChroma,  ///< the same, and back to RGB
};

/// A row of `width` pixels of `bands` samples of `sampleSize` bytes (1 or 2).
struct DecodedRow {
  const uint8_t* bytes;
  int width;
  int bands;
  size_t sampleSize;
};

/// The colour behind transparent pixels, samples from 0 to kBrightest.
using Background = std::array<float, 3>;

/// Returns the number of samples per pixel after the conversion.
int ChangedBands(RowChange change, int bands);

/// Returns the bytes per sample after the conversion.
size_t ChangedSampleSize(RowChange change, size_t sampleSize);

/// Writes the converted row to `out`, which has room for it and is aligned for its samples.
/// kLumaChroma and kThroughLumaChroma require 3 bands, or 4, of which the last is dropped.
void ChangeRow(const DecodedRow& row, RowChange change, const Background& background, uint8_t* out);

}  // namespace vela
