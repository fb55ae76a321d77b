// The innermost loops over samples, which take most of the time besides the JPEG library.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "picture/resize_filter.h"

namespace vela {

/// Rows that are scaled from left to right at a time.
constexpr size_t kBlockRows = 8;

/// Room for a row of `size` samples, for loops that take several samples at a time: a multiple of
/// 32.
size_t PaddedSize(size_t size);

/// A row that adds to a sum.
struct WeightedRow {
  const float* samples;
  float weight;
};

/// Writes the sum of `count` weighted rows to `out`, cut at 0 and kBrightest. `size` is a padded
/// one.
void SumRows(const WeightedRow* rows, size_t count, float* out, size_t size);

/// Two rows that add to a sum with one weight.
struct WeightedPair {
  const float* one;
  const float* other;
  float weight;
};

/// Writes the sum of the weighted row `middle` and of `count` weighted pairs to `out`. `size` is a
/// padded one.
void SumPairs(const WeightedRow& middle, const WeightedPair* pairs, size_t count, float* out,
              size_t size);

/// Writes kBlockRows rows, `stride` (a padded size) apart, so that their samples of one place lie
/// side by side.
void RowsToLanes(const float* rows, size_t stride, float* lanes);

/// The way back.
void LanesToRows(const float* lanes, size_t stride, float* rows);

/// Scales a block of rows with `channels` samples (1, 3 or 4) a pixel, whose samples of one place
/// lie side by side, and cuts them at 0 and kBrightest.
void FilterLanes(const std::vector<Contribution>& contributions, const float* lanes, int channels,
                 float* out);

/// Writes the samples of a JPEG as those of a picture.
void WidenRow(const uint8_t* row, float* out, size_t size);

/// Writes the samples of a picture as numbers to calculate with.
void WidenRow(const uint16_t* row, float* out, size_t size);

/// Writes samples as those of a picture, what lies outside of the range as its end.
void RoundToPicture(const float* row, uint16_t* out, size_t size);

/// Writes the samples of a picture as those of a JPEG.
void RoundRow(const float* row, uint8_t* out, size_t size);

/// Writes each sample, with `amount` times its difference from `blurred` added where the
/// difference, doubled, reaches `threshold`.
void SharpenRow(const float* row, const float* blurred, float amount, float threshold, float* out,
                size_t size);

}  // namespace vela
