#include "sample_loops.h"

#include <algorithm>
#include <cmath>
#include <cstring>

#include "picture.h"

// Chosen when the program starts: the wider instructions where the processor has them.
#ifdef CONVERT_THUMB_VECTOR_CLONES
#define VECTOR_CLONES __attribute__((target_clones("avx2", "default")))
#else
#define VECTOR_CLONES
#endif

namespace {

/// Four neighbouring samples, added and multiplied lane by lane.
using Lanes = float __attribute__((vector_size(16)));

inline Lanes LoadLanes(const float* samples) {
  Lanes lanes;
  std::memcpy(&lanes, samples, sizeof lanes);
  return lanes;
}

}  // namespace

VECTOR_CLONES void AddRow(const WeightedRow& row, float* sum, size_t size) {
  const WeightedRow a = row;
  for (size_t i = 0; i < size; ++i) {
    sum[i] += a.weight * a.samples[i];
  }
}

VECTOR_CLONES void AddFourRows(const WeightedRow* rows, float* sum, size_t size) {
  const WeightedRow a = rows[0];
  const WeightedRow b = rows[1];
  const WeightedRow c = rows[2];
  const WeightedRow d = rows[3];
  for (size_t i = 0; i < size; ++i) {
    sum[i] += a.weight * a.samples[i] + b.weight * b.samples[i] + c.weight * c.samples[i] +
              d.weight * d.samples[i];
  }
}

VECTOR_CLONES void AddPair(const float* one, const float* other, float weight, float* sum,
                           size_t size) {
  for (size_t i = 0; i < size; ++i) {
    sum[i] += weight * (one[i] + other[i]);
  }
}

VECTOR_CLONES void ScaleRow(const WeightedRow& row, float* out, size_t size) {
  const WeightedRow a = row;
  for (size_t i = 0; i < size; ++i) {
    out[i] = a.weight * a.samples[i];
  }
}

VECTOR_CLONES void Clamp(float* samples, size_t size) {
  for (size_t i = 0; i < size; ++i) {
    const float positive = samples[i] < 0 ? 0 : samples[i];
    samples[i] = positive > kBrightest ? kBrightest : positive;
  }
}

VECTOR_CLONES void WidenRow(const uint8_t* row, float* out, size_t size) {
  for (size_t i = 0; i < size; ++i) {
    out[i] = static_cast<float>(row[i] * kJpegStep);
  }
}

VECTOR_CLONES void RoundRow(const uint16_t* row, uint8_t* out, size_t size) {
  for (size_t i = 0; i < size; ++i) {
    // As dividing by kJpegStep does, for every sample there is.
    const unsigned rounded = row[i] + 128U;
    out[i] = static_cast<uint8_t>((rounded - (rounded >> 8)) >> 8);
  }
}

VECTOR_CLONES void SharpenRow(uint16_t* row, const float* blurred, float amount, float threshold,
                              size_t size) {
  for (size_t i = 0; i < size; ++i) {
    const float sample = row[i];
    const float difference = sample - blurred[i];
    const float share = 2 * std::fabs(difference) < threshold ? 0.0F : amount;
    row[i] = ToSample(sample + difference * share);
  }
}

VECTOR_CLONES void FilterGreyRow(const std::vector<Contribution>& contributions, const float* row,
                                 uint16_t* out) {
  for (const Contribution& contribution : contributions) {
    const float* const samples = row + contribution.first;
    float sum = 0;
    for (size_t i = 0; i < contribution.weights.size(); ++i) {
      sum += contribution.weights[i] * samples[i];
    }
    *out++ = ToSample(sum);
  }
}

VECTOR_CLONES void FilterColourRow(const std::vector<Contribution>& contributions, const float* row,
                                   uint16_t* out) {
  for (const Contribution& contribution : contributions) {
    const float* samples = row + static_cast<size_t>(contribution.first) * 3;
    const std::vector<float>& weights = contribution.weights;
    // Two sums, so that an addition need not wait for the one before it.
    Lanes even = {};
    Lanes odd = {};
    size_t i = 0;
    for (; i + 2 <= weights.size(); i += 2) {
      even += weights[i] * LoadLanes(samples);
      odd += weights[i + 1] * LoadLanes(samples + 3);
      samples += 6;
    }
    if (i < weights.size()) {
      even += weights[i] * LoadLanes(samples);
    }
    const Lanes sum = even + odd;
    for (int lane = 0; lane < 3; ++lane) {
      *out++ = ToSample(sum[lane]);
    }
  }
}
