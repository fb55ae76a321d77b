// Whether conversion may run.
#pragma once

#include <chrono>
#include <optional>
#include <string>

namespace vela {

/// Why conversion is paused, and after which time to check again.
struct ConversionPause {
  std::string reason;
  std::chrono::seconds checkAfter;
};

/// Checks whether conversion may run, no more often than needed.
class PauseGate {
 public:
  using Clock = std::chrono::steady_clock;

  /// Returns whether photos may be converted now: the resume time is reached and the index daemon
  /// has not switched conversion off. A pause is logged once.
  bool MayStart();

  /// Returns whether no index daemon was listening when it was asked last. That is logged once.
  bool IsDaemonAbsent() const { return isDaemonAbsent_; }

  /// Returns when to check again, nothing while conversion may run.
  std::optional<Clock::time_point> NextCheck() const { return pausedUntil_; }

 private:
  std::optional<ConversionPause> FindPause();
  bool IsSwitchedOff();
  void NoteAbsence(bool isAbsent);

  Clock::time_point allowedUntil_;
  std::optional<Clock::time_point> pausedUntil_;
  std::string reason_;
  bool isDaemonAbsent_ = false;
};

}  // namespace vela
