// Whether conversion may run.
#pragma once

#include <chrono>
#include <optional>
#include <string>

namespace vela {

/// Why conversion rests, and when to ask again.
struct ConversionPause {
  std::string reason;
  std::chrono::seconds askAgain;
};

/// Keeps asking whether conversion may run, as often as is needed and no more.
class PauseGate {
 public:
  using Clock = std::chrono::steady_clock;

  /// Returns whether photos may be converted now. A pause is told in the log once.
  bool MayStart();

  /// Returns when it is worth asking again, nothing while conversion may run.
  std::optional<Clock::time_point> AskAgain() const { return pausedUntil_; }

 private:
  Clock::time_point mayStartUntil_;
  std::optional<Clock::time_point> pausedUntil_;
  std::string reason_;
};

/// Returns nothing when photos may be converted now: the resume time is reached and the index
/// service has not switched conversion off.
std::optional<ConversionPause> FindConversionPause();

}  // namespace vela
