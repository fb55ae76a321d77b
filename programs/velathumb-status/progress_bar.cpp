#include "progress_bar.h"

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

std::string FormatBar(const ProgressCount& count, int width) {
  const int inner = width - 2;
  const int done = count.PartOf(inner);
  return '[' + std::string(static_cast<size_t>(done), '#') +
         std::string(static_cast<size_t>(inner - done), '.') + ']';
}

}  // namespace

std::string FormatProgressBar(const FollowedCount& followed, const ProgressRate& rate, int width) {
  const ProgressCount& count = followed.count;
  if (count.total <= 0) {
    return std::to_string(count.completed) + ' ' + followed.unit + FormatRate(rate);
  }
  char text[96] = "";
  std::snprintf(text, sizeof text, " %3d%%  %d of %d %s", count.PartOf(100), count.completed,
                count.total, followed.unit);
  const std::string rest = text + FormatRate(rate) + FormatTimeLeft(rate, count.total);
  const int room = width - 1 - static_cast<int>(rest.size());
  return room < kShortestBar ? rest.substr(1) : FormatBar(count, room) + rest;
}

}  // namespace vela
