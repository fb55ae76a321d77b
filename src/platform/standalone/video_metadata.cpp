#include <algorithm>
#include <array>
#include <cerrno>
#include <cmath>
#include <cstdint>
#include <cstring>

#include "platform/standalone/last_error.h"
#include "platform/standalone/video_container.h"
#include "platform/velaindex.h"

namespace {

using vela::Fail;
using vela::VideoContainer;

/// Rounds to the nearest value in range.
int32_t ToInt32(double value) {
  return static_cast<int32_t>(std::lround(std::clamp<double>(value, INT32_MIN, INT32_MAX)));
}

/// Returns degrees clockwise, rounded to a multiple of 90: players do not support other angles.
int32_t RotationOf(const VideoContainer& container) {
  constexpr double kQuarterTurn = 90;
  std::array<int32_t, 9> matrix;
  size_t size = 0;
  const uint8_t* data =
      container.Library().SideDataOf(*container.VideoStream(), AV_PKT_DATA_DISPLAYMATRIX, size);
  if (data == nullptr || size < sizeof matrix) {
    return 0;
  }
  std::memcpy(matrix.data(), data, sizeof matrix);
  const double anticlockwise = container.Library().getRotation(matrix.data());
  if (!std::isfinite(anticlockwise)) {
    return 0;
  }
  const long quarters = std::lround(-anticlockwise / kQuarterTurn);
  return static_cast<int32_t>((quarters % 4 + 4) % 4) * 90;
}

double LongestStream(const AVFormatContext& format) {
  double longest = 0;
  for (unsigned i = 0; i < format.nb_streams; ++i) {
    const AVStream& stream = *format.streams[i];
    if (stream.duration == AV_NOPTS_VALUE || stream.time_base.den == 0) {
      continue;
    }
    const double tick = static_cast<double>(stream.time_base.num) / stream.time_base.den;
    longest = std::max(longest, static_cast<double>(stream.duration) * tick);
  }
  return longest;
}

/// Returns seconds, 0 when the duration is unknown so far.
double DurationOf(const AVFormatContext& format) {
  // Fragmented files have a duration of 0 in their headers.
  const bool isKnown = format.duration != AV_NOPTS_VALUE && format.duration > 0;
  return isKnown ? static_cast<double>(format.duration) / AV_TIME_BASE : LongestStream(format);
}

/// Returns bits per second, 0 when the bit rate is unknown so far.
double BitRateOf(const VideoContainer& container, double duration) {
  constexpr double kBitsPerByte = 8;
  if (container.Format().bit_rate > 0) {
    return static_cast<double>(container.Format().bit_rate);
  }
  if (duration <= 0) {
    return 0;
  }
  return static_cast<double>(container.FileSize()) * kBitsPerByte / duration;
}

}  // namespace

int VELAIDX_GetVideoMetadata(const char* path, _VIDEO_METADATA_* metadata) {
  if (path == nullptr || metadata == nullptr) {
    return Fail(EINVAL);
  }
  VideoContainer container;
  const int error = container.OpenWithVideo(path);
  if (error != 0) {
    return Fail(error);
  }
  double duration = DurationOf(container.Format());
  if (duration <= 0 && container.Probe()) {
    duration = DurationOf(container.Format());
  }
  *metadata = {RotationOf(container), ToInt32(duration), ToInt32(BitRateOf(container, duration))};
  return 0;
}
