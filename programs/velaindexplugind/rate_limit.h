// Keeps clients from flooding the log.
#pragma once

#include <chrono>

namespace vela {

/// Lets a number of lines pass in each stretch of time and counts those that it holds back.
class RateLimit {
 public:
  using Clock = std::chrono::steady_clock;

  RateLimit(int burst, Clock::duration stretch) : burst_(burst), stretch_(stretch) {}

  /// Returns whether the line may pass. `heldBack` is then how many have not since the last one
  /// that did.
  bool Pass(Clock::time_point now, int& heldBack) {
    if (passed_ == 0 || now - begin_ >= stretch_) {
      begin_ = now;
      passed_ = 0;
    }
    if (passed_ >= burst_) {
      ++heldBack_;
      return false;
    }
    ++passed_;
    heldBack = heldBack_;
    heldBack_ = 0;
    return true;
  }

 private:
  const int burst_;
  const Clock::duration stretch_;
  Clock::time_point begin_{};
  int passed_ = 0;
  int heldBack_ = 0;
};

}  // namespace vela
