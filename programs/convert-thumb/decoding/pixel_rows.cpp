#include "decoding/pixel_rows.h"

#include <cstring>

#include "picture/colour_conversion.h"
#include "picture/picture.h"

namespace vela {

namespace {

template <typename Sample>
constexpr int kMaxSample = (1 << (8 * static_cast<int>(sizeof(Sample)))) - 1;

/// Writes 16 bits even for 8-bit samples: a mixture of two colours has values between theirs.
template <typename Sample>
void PutOnBackground(const Sample* in, int width, int bands, const Background& background,
                     uint16_t* out) {
  constexpr float kScale = kBrightest / static_cast<float>(kMaxSample<Sample>);
  for (int x = 0; x < width; ++x) {
    const float opacity =
        static_cast<float>(in[bands - 1]) / static_cast<float>(kMaxSample<Sample>);
    for (int band = 0; band + 1 < bands; ++band) {
      const float sample = kScale * static_cast<float>(in[band]);
      const float behind = background[static_cast<size_t>(band)];
      *out++ = ToSample(behind + opacity * (sample - behind));
    }
    in += bands;
  }
}

template <typename Sample>
void Invert(const Sample* in, size_t samples, Sample* out) {
  for (size_t i = 0; i < samples; ++i) {
    out[i] = static_cast<Sample>(kMaxSample<Sample> - in[i]);
  }
}

template <typename Sample>
void MakeLumaChroma(const Sample* in, int width, int bands, uint16_t* out) {
  constexpr float kScale = kBrightest / static_cast<float>(kMaxSample<Sample>);
  for (int x = 0; x < width; ++x) {
    const float red = kScale * static_cast<float>(in[0]);
    const float green = kScale * static_cast<float>(in[1]);
    const float blue = kScale * static_cast<float>(in[2]);
    RgbToLumaChroma(red, green, blue, out);
    in += bands;
    out += 3;
  }
}

template <typename Sample>
void Change(const DecodedRow& row, RowChange change, const Background& background, uint8_t* out) {
  const auto* const in = reinterpret_cast<const Sample*>(row.bytes);
  const size_t samples = static_cast<size_t>(row.width) * static_cast<size_t>(row.bands);
  switch (change) {
    case RowChange::kNone:
      std::memcpy(out, in, samples * sizeof(Sample));
      break;
    case RowChange::kOnBackground:
      PutOnBackground(in, row.width, row.bands, background, reinterpret_cast<uint16_t*>(out));
      break;
    case RowChange::kInvert:
      Invert(in, samples, reinterpret_cast<Sample*>(out));
      break;
    case RowChange::kLumaChroma:
      MakeLumaChroma(in, row.width, row.bands, reinterpret_cast<uint16_t*>(out));
      break;
    case RowChange::kThroughLumaChroma:
      MakeLumaChroma(in, row.width, row.bands, reinterpret_cast<uint16_t*>(out));
      LumaChromaToRgb(reinterpret_cast<uint16_t*>(out), static_cast<size_t>(row.width));
      break;
  }
}

}  // namespace

int ChangedBands(RowChange change, int bands) {
  switch (change) {
    case RowChange::kLumaChroma:
    case RowChange::kThroughLumaChroma:
      return 3;
    case RowChange::kOnBackground:
      return bands - 1;
    default:
      return bands;
  }
}

size_t ChangedSampleSize(RowChange change, size_t sampleSize) {
  return change == RowChange::kNone || change == RowChange::kInvert ? sampleSize : sizeof(uint16_t);
}

void ChangeRow(const DecodedRow& row, RowChange change, const Background& background,
               uint8_t* out) {
  if (row.sampleSize == sizeof(uint8_t)) {
    Change<uint8_t>(row, change, background, out);
  } else {
    Change<uint16_t>(row, change, background, out);
  }
}

}  // namespace vela
