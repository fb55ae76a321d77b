#include "picture/sample_loops.h"

#include <algorithm>
#include <cmath>

#include "picture/picture.h"

namespace vela {

// The variant for the widest instructions that the processor supports is chosen at program start.
#ifdef CONVERT_THUMB_VECTOR_CLONES
#define VECTOR_CLONES __attribute__((target_clones("arch=x86-64-v4", "arch=x86-64-v3", "default")))
#else
#define VECTOR_CLONES
#endif

#define INLINE inline __attribute__((always_inline))

namespace {

/// Sums are computed for a number of samples that fits into the first-level cache.
constexpr size_t kTile = 512;
constexpr size_t kPadding = 32;
static_assert(kTile % kPadding == 0);

constexpr size_t kFewRows = 4;

/// Four neighbouring samples anywhere in memory.
using Four = float __attribute__((vector_size(16), aligned(4), may_alias));

INLINE float Clamp(float sample) {
  const float positive = sample < 0 ? 0 : sample;
  return positive > kBrightest ? kBrightest : positive;
}

/// Adds up to four rows at a time, so that the sum is loaded and stored less often. `Keep`: add to
/// the existing sum.
template <size_t Count, bool Keep>
INLINE void AddRows(const WeightedRow* rows, size_t from, float* __restrict sum, size_t size) {
  const float* samples[Count];
  float weights[Count];
  for (size_t row = 0; row < Count; ++row) {
    samples[row] = rows[row].samples + from;
    weights[row] = rows[row].weight;
  }
  for (size_t i = 0; i < size; ++i) {
    float value = Keep ? sum[i] : 0;
    for (size_t row = 0; row < Count; ++row) {
      value += weights[row] * samples[row][i];
    }
    sum[i] = value;
  }
}

template <bool Keep>
INLINE void AddFewRows(const WeightedRow* rows, size_t count, size_t from, float* sum,
                       size_t size) {
  switch (count) {
    case 1:
      AddRows<1, Keep>(rows, from, sum, size);
      break;
    case 2:
      AddRows<2, Keep>(rows, from, sum, size);
      break;
    case 3:
      AddRows<3, Keep>(rows, from, sum, size);
      break;
    default:
      AddRows<4, Keep>(rows, from, sum, size);
      break;
  }
}

INLINE void ScaleRow(const WeightedRow& row, size_t from, float* __restrict out, size_t size) {
  const float* const a = row.samples + from;
  for (size_t i = 0; i < size; ++i) {
    out[i] = row.weight * a[i];
  }
}

INLINE void AddPair(const WeightedPair& pair, size_t from, float* __restrict sum, size_t size) {
  const float* const one = pair.one + from;
  const float* const other = pair.other + from;
  for (size_t i = 0; i < size; ++i) {
    sum[i] += pair.weight * (one[i] + other[i]);
  }
}

INLINE void AddTwoPairs(const WeightedPair* pairs, size_t from, float* __restrict sum,
                        size_t size) {
  const float* const a = pairs[0].one + from;
  const float* const b = pairs[0].other + from;
  const float* const c = pairs[1].one + from;
  const float* const d = pairs[1].other + from;
  const float weights[] = {pairs[0].weight, pairs[1].weight};
  for (size_t i = 0; i < size; ++i) {
    sum[i] += weights[0] * (a[i] + b[i]) + weights[1] * (c[i] + d[i]);
  }
}

/// Swaps rows and columns of four times four samples.
INLINE void Transpose(const float* in, size_t inStride, float* out, size_t outStride) {
  const Four a = *reinterpret_cast<const Four*>(in);
  const Four b = *reinterpret_cast<const Four*>(in + inStride);
  const Four c = *reinterpret_cast<const Four*>(in + 2 * inStride);
  const Four d = *reinterpret_cast<const Four*>(in + 3 * inStride);
  const Four abLeft = __builtin_shufflevector(a, b, 0, 4, 1, 5);
  const Four abRight = __builtin_shufflevector(a, b, 2, 6, 3, 7);
  const Four cdLeft = __builtin_shufflevector(c, d, 0, 4, 1, 5);
  const Four cdRight = __builtin_shufflevector(c, d, 2, 6, 3, 7);
  *reinterpret_cast<Four*>(out) = __builtin_shufflevector(abLeft, cdLeft, 0, 1, 4, 5);
  *reinterpret_cast<Four*>(out + outStride) = __builtin_shufflevector(abLeft, cdLeft, 2, 3, 6, 7);
  *reinterpret_cast<Four*>(out + 2 * outStride) =
      __builtin_shufflevector(abRight, cdRight, 0, 1, 4, 5);
  *reinterpret_cast<Four*>(out + 3 * outStride) =
      __builtin_shufflevector(abRight, cdRight, 2, 3, 6, 7);
}

template <size_t Channels>
INLINE void FilterPixels(const std::vector<Contribution>& contributions, const float* lanes,
                         float* __restrict out) {
  constexpr size_t kPixel = Channels * kBlockRows;
  for (const Contribution& contribution : contributions) {
    const float* in = lanes + static_cast<size_t>(contribution.first) * kPixel;
    const float* weight = contribution.weights.data();
    const float* const end = weight + contribution.weights.size();
    float sums[kPixel];
    for (size_t i = 0; i < kPixel; ++i) {
      sums[i] = *weight * in[i];
    }
    while (++weight != end) {
      in += kPixel;
      for (size_t i = 0; i < kPixel; ++i) {
        sums[i] += *weight * in[i];
      }
    }
    for (size_t i = 0; i < kPixel; ++i) {
      out[i] = Clamp(sums[i]);
    }
    out += kPixel;
  }
}

}  // namespace

size_t PaddedSize(size_t size) {
  return (size + kPadding - 1) / kPadding * kPadding;
}

VECTOR_CLONES void SumRows(const WeightedRow* rows, size_t count, float* out, size_t size) {
  for (size_t from = 0; from < size; from += kTile) {
    const size_t tile = std::min(kTile, size - from);
    float* const sum = out + from;
    AddFewRows<false>(rows, std::min(count, kFewRows), from, sum, tile);
    for (size_t row = kFewRows; row < count; row += kFewRows) {
      AddFewRows<true>(rows + row, std::min(count - row, kFewRows), from, sum, tile);
    }
    // Overshoot is clamped after each direction.
    for (size_t i = 0; i < tile; ++i) {
      sum[i] = Clamp(sum[i]);
    }
  }
}

VECTOR_CLONES void SumPairs(const WeightedRow& middle, const WeightedPair* pairs, size_t count,
                            float* out, size_t size) {
  for (size_t from = 0; from < size; from += kTile) {
    const size_t tile = std::min(kTile, size - from);
    float* const sum = out + from;
    ScaleRow(middle, from, sum, tile);
    size_t pair = 0;
    for (; pair + 2 <= count; pair += 2) {
      AddTwoPairs(pairs + pair, from, sum, tile);
    }
    if (pair < count) {
      AddPair(pairs[pair], from, sum, tile);
    }
  }
}

VECTOR_CLONES void RowsToLanes(const float* rows, size_t stride, float* lanes) {
  for (size_t i = 0; i < stride; i += 4) {
    for (size_t row = 0; row < kBlockRows; row += 4) {
      Transpose(rows + row * stride + i, stride, lanes + i * kBlockRows + row, kBlockRows);
    }
  }
}

VECTOR_CLONES void LanesToRows(const float* lanes, size_t stride, float* rows) {
  for (size_t i = 0; i < stride; i += 4) {
    for (size_t row = 0; row < kBlockRows; row += 4) {
      Transpose(lanes + i * kBlockRows + row, kBlockRows, rows + row * stride + i, stride);
    }
  }
}

VECTOR_CLONES void FilterLanes(const std::vector<Contribution>& contributions, const float* lanes,
                               int channels, float* out) {
  switch (channels) {
    case 1:
      FilterPixels<1>(contributions, lanes, out);
      break;
    case 3:
      FilterPixels<3>(contributions, lanes, out);
      break;
    default:
      FilterPixels<4>(contributions, lanes, out);
      break;
  }
}

VECTOR_CLONES void WidenRow(const uint8_t* row, float* out, size_t size) {
  for (size_t i = 0; i < size; ++i) {
    out[i] = static_cast<float>(row[i] * kJpegStep);
  }
}

VECTOR_CLONES void RoundToPicture(const float* row, uint16_t* out, size_t size) {
  for (size_t i = 0; i < size; ++i) {
    out[i] = ToSample(row[i]);
  }
}

VECTOR_CLONES void WidenRow(const uint16_t* row, float* out, size_t size) {
  for (size_t i = 0; i < size; ++i) {
    out[i] = row[i];
  }
}

VECTOR_CLONES void RoundRow(const float* row, uint8_t* out, size_t size) {
  for (size_t i = 0; i < size; ++i) {
    // Samples are not negative, and std::lround would keep the loop from being vectorized.
    // NOLINTNEXTLINE(bugprone-incorrect-roundings)
    out[i] = static_cast<uint8_t>(static_cast<int>(row[i] * (1.0F / kJpegStep) + 0.5F));
  }
}

VECTOR_CLONES void SharpenRow(const float* row, const float* blurred, float amount, float threshold,
                              float* __restrict out, size_t size) {
  for (size_t i = 0; i < size; ++i) {
    const float difference = row[i] - blurred[i];
    const float share = 2 * std::fabs(difference) < threshold ? 0.0F : amount;
    out[i] = Clamp(row[i] + difference * share);
  }
}

}  // namespace vela
