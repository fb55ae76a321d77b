// The innermost loops over samples, which take most of the time besides the JPEG library.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "resize_filter.h"

/// A row that adds to a sum.
struct WeightedRow {
  const float* samples;
  float weight;
};

/// Adds one weighted row of `size` samples to `sum`.
void AddRow(const WeightedRow& row, float* sum, size_t size);

/// Adds four weighted rows at a time, so that the sum is loaded and stored less often.
void AddFourRows(const WeightedRow* rows, float* sum, size_t size);

/// Adds both rows, weighted alike, to `sum`.
void AddPair(const float* one, const float* other, float weight, float* sum, size_t size);

/// Writes the weighted row to `out`.
void ScaleRow(const WeightedRow& row, float* out, size_t size);

/// Cuts what lies outside of 0 to kBrightest.
void Clamp(float* samples, size_t size);

/// Writes the samples of a JPEG as those of a picture.
void WidenRow(const uint8_t* row, float* out, size_t size);

/// Writes the samples of a picture as those of a JPEG.
void RoundRow(const uint16_t* row, uint8_t* out, size_t size);

/// Adds `amount` times the difference from `blurred` to each sample whose difference, doubled,
/// reaches `threshold`.
void SharpenRow(uint16_t* row, const float* blurred, float amount, float threshold, size_t size);

/// Makes a scaled row of one-sample pixels.
void FilterGreyRow(const std::vector<Contribution>& contributions, const float* row, uint16_t* out);

/// The same for three-sample pixels. Reads one sample past the end of `row`.
void FilterColourRow(const std::vector<Contribution>& contributions, const float* row,
                     uint16_t* out);
