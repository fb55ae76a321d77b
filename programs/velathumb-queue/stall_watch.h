// Notices a velathumb that makes no progress.
#pragma once

#include <chrono>
#include <functional>
#include <map>
#include <optional>

#include "configuration/settings.h"
#include "posix/processes.h"

namespace vela {

/// How long a velathumb may make no progress.
struct StallLimits {
  std::chrono::seconds stall = kDefaultStallTimeout;  ///< 0: without limit
  std::chrono::seconds tool = kDefaultToolTimeout;    ///< 0: without limit
};

/// Returns the limits in the settings of the machine.
StallLimits ReadStallLimits();

/// Observes one velathumb. It makes progress while it or a process that it has started uses the
/// processor or writes, when it starts another process, and while a tool is running, which
/// velathumb itself limits to tool_timeout.
class StallWatch {
 public:
  using Clock = std::chrono::steady_clock;
  using Sampler = std::function<std::optional<ProcessActivity>()>;

  /// What the observer has to do.
  enum class Action {
    kNone,
    kTerminate,  ///< end the velathumb
    kKill,       ///< it has not ended
    kGiveUp,     ///< not even then: it waits in the kernel
  };

  StallWatch(StallLimits limits, Clock::time_point now, Sampler sampler);

  /// Checks the progress when it is time. Returns each action once.
  Action Check(Clock::time_point now);

  /// Returns when to check next, nothing without a limit.
  std::optional<Clock::time_point> NextCheck() const { return nextCheck_; }

  /// Returns whether the velathumb was to be terminated.
  bool HasStalled() const { return stage_ != Stage::kWatching; }

  std::chrono::seconds Limit() const { return limits_.stall; }

 private:
  enum class Stage { kWatching, kTerminated, kKilled, kGivenUp };

  bool HasProgressed(Clock::time_point now);
  bool IsToolRunning(const ProcessActivity& activity, Clock::time_point now);
  Action Advance(Stage stage, Action action, Clock::time_point now);

  StallLimits limits_;
  Clock::duration interval_;
  Sampler sampler_;
  Stage stage_ = Stage::kWatching;
  std::optional<Clock::time_point> nextCheck_;
  Clock::time_point lastCheck_;
  Clock::duration stalledFor_{0};
  ProcessActivity last_;
  std::map<ProcessIdentity, Clock::time_point> firstSeen_;  // of the descendants
};

}  // namespace vela
