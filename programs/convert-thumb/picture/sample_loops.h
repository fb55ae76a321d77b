// The innermost loops over samples, which take most of the time outside the JPEG library.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "picture/resize_filter.h"

namespace vela {

/// Number of rows that are scaled horizontally at once.
constexpr size_t kBlockRows = 8;

/// Returns the size of a row of `size` samples, rounded up to a multiple of 32 for loops that
/// process several samples at a time.
size_t PaddedSize(size_t size);

/// A row in a weighted sum.
struct WeightedRow {
  const float* samples;
  float weight;
};

/// Writes the sum of `count` weighted rows to `out`, clamped to 0 and kBrightest. `size` is padded.
void SumRows(const WeightedRow* rows, size_t count, float* out, size_t size);

/// Two rows with the same weight in a weighted sum.
struct WeightedPair {
  const float* one;
  const float* other;
  float weight;
};

/// Writes the sum of the weighted row `middle` and `count` weighted pairs to `out`. `size` is
/// padded.
void SumPairs(const WeightedRow& middle, const WeightedPair* pairs, size_t count, float* out,
              size_t size);

/// Interleaves kBlockRows rows that are `stride` (a padded size) samples apart: for each position,
/// the sample of every row.
void RowsToLanes(const float* rows, size_t stride, float* lanes);

/// Reverses RowsToLanes.
void LanesToRows(const float* lanes, size_t stride, float* rows);

/// Scales a block of interleaved rows with `channels` samples (1, 3 or 4) a pixel horizontally and
/// clamps the result to 0 and kBrightest.
void FilterLanes(const std::vector<Contribution>& contributions, const float* lanes, int channels,
                 float* out);

/// Converts 8-bit samples to samples of a picture.
void WidenRow(const uint8_t* row, float* out, size_t size);

/// Converts the samples of a picture to floating point.
void WidenRow(const uint16_t* row, float* out, size_t size);

/// Rounds to samples of a picture; values out of range are clamped.
void RoundToPicture(const float* row, uint16_t* out, size_t size);

/// Rounds to 8-bit samples.
void RoundRow(const float* row, uint8_t* out, size_t size);

/// Adds to each sample `amount` times its difference from `blurred` where twice the difference
/// reaches `threshold`.
void SharpenRow(const float* row, const float* blurred, float amount, float threshold, float* out,
                size_t size);

}  // namespace vela
