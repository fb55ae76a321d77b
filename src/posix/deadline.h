// A time at which a wait ends.
#pragma once

#include <chrono>

namespace vela {

/// A deadline on the monotonic clock.
class Deadline {
 public:
  using Clock = std::chrono::steady_clock;

  /// Ends `limit` from now.
  explicit Deadline(std::chrono::seconds limit) : end_(Clock::now() + limit) {}

  Clock::time_point End() const { return end_; }

  /// Returns the time left, never negative.
  std::chrono::nanoseconds Left() const {
    const auto left = end_ - Clock::now();
    return left > Clock::duration::zero() ? left : Clock::duration::zero();
  }

  /// Returns the time left in milliseconds, as poll takes it: rounded up, so that a wait never ends
  /// just before the deadline, and at most an hour.
  int PollMilliseconds() const {
    constexpr std::chrono::milliseconds kLongest = std::chrono::hours(1);
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(Left());
    return static_cast<int>((left < kLongest ? left : kLongest).count());
  }

 private:
  Clock::time_point end_;
};

}  // namespace vela
