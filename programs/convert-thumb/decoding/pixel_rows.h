// Rows of samples as a decoder has them, made into rows of a photo.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

namespace vela {

/// What has to be done to a decoder's row.
enum class RowChange {
  kNone,
  kOnBackground,       ///< the last sample of each pixel is its opacity
  kInvert,             ///< amounts of ink become shares of light
  kLumaChroma,         ///< of red, green and blue, brightness and colour differences are made
  kThroughLumaChroma,  ///< the same, and red, green and blue again
};

/// A row of `width` pixels of `bands` samples of `sampleSize` bytes (1 or 2).
struct DecodedRow {
  const uint8_t* bytes;
  int width;
  int bands;
  size_t sampleSize;
};

/// What shows through, samples from 0 to kBrightest.
using Background = std::array<float, 3>;

/// Samples of a pixel after the change.
int ChangedBands(RowChange change, int bands);

/// Bytes of a sample after the change.
size_t ChangedSampleSize(RowChange change, size_t sampleSize);

/// Writes the changed row to `out`, which has room for it and is aligned for its samples. Changes
/// to brightness take 3 bands, or 4 of which they drop the last.
void ChangeRow(const DecodedRow& row, RowChange change, const Background& background, uint8_t* out);

}  // namespace vela
