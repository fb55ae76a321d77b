#include "progress_rate.h"

#include <algorithm>
#include <cmath>

namespace vela {

namespace {

constexpr std::chrono::seconds kWindow(30);
/// A year: anything longer counts as unknown.
constexpr double kLongestSeconds = 365.0 * 24 * 3600;

}  // namespace

void ProgressRate::Note(Clock::time_point time, int completed) {
  if (!samples_.empty() && completed < samples_.back().completed) {
    samples_.clear();
  }
  samples_.push_back({time, completed});
  // One sample from before the window is kept, so that there is always an interval to measure.
  while (samples_.size() > 2 && samples_[1].time <= time - kWindow) {
    samples_.pop_front();
  }
}

std::optional<double> ProgressRate::PerSecond() const {
  if (samples_.size() < 2) {
    return std::nullopt;
  }
  const std::chrono::duration<double> time = samples_.back().time - samples_.front().time;
  if (time.count() <= 0) {
    return std::nullopt;
  }
  // As floating point: the difference of two counters may not fit into an int.
  const double made = static_cast<double>(samples_.back().completed) -
                      static_cast<double>(samples_.front().completed);
  return made / time.count();
}

std::optional<std::chrono::seconds> ProgressRate::TimeLeft(int total) const {
  const auto rate = PerSecond();
  if (!rate || *rate <= 0) {
    return std::nullopt;
  }
  const double left = static_cast<double>(total) - static_cast<double>(samples_.back().completed);
  const double seconds = std::max(0.0, left) / *rate;
  if (seconds > kLongestSeconds) {
    return std::nullopt;
  }
  return std::chrono::seconds(std::lround(std::ceil(seconds)));
}

}  // namespace vela
