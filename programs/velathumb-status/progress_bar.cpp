#include "progress_bar.h"

#include <algorithm>
#include <cstdint>
#include <cstdio>

namespace vela {

namespace {

constexpr int kShortestBar = 10;

std::string FormatDuration(std::chrono::seconds duration) {
  const auto seconds = static_cast<long>(duration.count());
  char text[64] = "";
  if (seconds < 3600) {
    std::snprintf(text, sizeof text, "%ld:%02ld", seconds / 60, seconds % 60);
  } else {
    std::snprintf(text, sizeof text, "%ld:%02ld:%02ld", seconds / 3600, seconds / 60 % 60,
                  seconds % 60);
  }
  return text;
}

std::string FormatRate(const ProgressRate& rate) {
  const auto perSecond = rate.PerSecond();
  if (!perSecond) {
    return {};
  }
  char text[64] = "";
  std::snprintf(text, sizeof text, "  %.1f/s", *perSecond);
  return text;
}

std::string FormatTimeLeft(const ProgressRate& rate, int total) {
  const auto left = rate.TimeLeft(total);
  return left ? "  " + FormatDuration(*left) + " left" : std::string();
}

/// Returns the completed part of `whole`, rounded down: the full value is not shown before the end.
/// The counters may be inconsistent.
int DonePart(const ProgressCount& count, int whole) {
  const int64_t done = std::clamp(count.completed, 0, count.total);
  return static_cast<int>(done * whole / count.total);
}

std::string FormatBar(const ProgressCount& count, int width) {
  const int inner = width - 2;
  const int done = DonePart(count, inner);
  return '[' + std::string(static_cast<size_t>(done), '#') +
         std::string(static_cast<size_t>(inner - done), '.') + ']';
}

}  // namespace

FollowedCount ChooseCount(const ProgressSummary& summary) {
  if (summary.thumb.total > 0 || summary.photo.total <= 0) {
    return {"thumbnails", summary.thumb};
  }
  return {"photos", summary.photo};
}

std::string FormatProgressBar(const FollowedCount& followed, const ProgressRate& rate, int width) {
  const ProgressCount& count = followed.count;
  if (count.total <= 0) {
    return std::to_string(count.completed) + ' ' + followed.unit + FormatRate(rate);
  }
  char text[96] = "";
  std::snprintf(text, sizeof text, " %3d%%  %d of %d %s", DonePart(count, 100), count.completed,
                count.total, followed.unit);
  const std::string rest = text + FormatRate(rate) + FormatTimeLeft(rate, count.total);
  const int room = width - 1 - static_cast<int>(rest.size());
  return room < kShortestBar ? rest.substr(1) : FormatBar(count, room) + rest;
}

}  // namespace vela
