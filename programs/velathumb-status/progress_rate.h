// How fast a counter advances.
#pragma once

#include <chrono>
#include <deque>
#include <optional>

namespace vela {

/// The rate of a counter over the last half minute.
class ProgressRate {
 public:
  using Clock = std::chrono::steady_clock;

  /// Notes the value of the counter at `time`; times must not decrease. A counter that decreased
  /// starts a new measurement.
  void Note(Clock::time_point time, int completed);

  /// Returns the rate per second, nothing while it is unknown.
  std::optional<double> PerSecond() const;

  /// Returns the time until the counter reaches `total`, nothing while that is unknown.
  std::optional<std::chrono::seconds> TimeLeft(int total) const;

 private:
  struct Sample {
    Clock::time_point time;
    int completed;
  };

  std::deque<Sample> samples_;
};

}  // namespace vela
