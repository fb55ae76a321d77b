#include "stall_watch.h"

#include <algorithm>
#include <utility>

#include "configuration/setting_values.h"
#include "configuration/settings.h"
#include "platform/system_rules.h"
#include "platform/vlibc.h"

namespace vela {

namespace {

/// How long a velathumb may take to end after a signal.
constexpr std::chrono::seconds kGrace(5);

/// Stores the number of seconds that the setting `key` gives, if it is one.
void ReadSeconds(const char* key, std::chrono::seconds& seconds) {
  char text[64] = "";
  if (VLIBCFileGetKeyValue(kSettingsFile, key, text, sizeof text, 0) <= 0) {
    return;
  }
  seconds = ParseSeconds(text).value_or(seconds);
}

/// Often enough to notice that the limit is reached a tenth too late at most.
StallWatch::Clock::duration IntervalFor(std::chrono::seconds limit) {
  constexpr std::chrono::seconds kLongest(30);
  return std::min<StallWatch::Clock::duration>(std::chrono::milliseconds(limit) / 10, kLongest);
}

}  // namespace

StallLimits ReadStallLimits() {
  StallLimits limits;
  ReadSeconds(kStallTimeoutKey, limits.stall);
  ReadSeconds(kToolTimeoutKey, limits.tool);
  return limits;
}

StallWatch::StallWatch(StallLimits limits, Clock::time_point now, Sampler sampler)
    : limits_(limits),
      interval_(IntervalFor(limits.stall)),
      sampler_(std::move(sampler)),
      lastCheck_(now) {
  if (limits_.stall > std::chrono::seconds(0)) {
    nextCheck_ = now + interval_;
  }
}

bool StallWatch::IsToolRunning(const ProcessActivity& activity, Clock::time_point now) {
  std::map<ProcessIdentity, Clock::time_point> seen;
  bool isRunning = false;
  for (const ProcessIdentity& process : activity.descendants) {
    const auto known = firstSeen_.find(process);
    const Clock::time_point first = known == firstSeen_.end() ? now : known->second;
    seen.emplace(process, first);
    const bool hasLimit = limits_.tool > std::chrono::seconds(0);
    isRunning = isRunning || !hasLimit || now - first < limits_.tool;
  }
  firstSeen_ = std::move(seen);
  return isRunning;
}

bool StallWatch::HasProgressed(Clock::time_point now) {
  std::optional<ProcessActivity> activity = sampler_();
  if (!activity) {
    return true;  // unknown, or it has just ended
  }
  const bool isToolRunning = IsToolRunning(*activity, now);
  // On a busy machine, a process may wait for a processor for long.
  const bool isActive = activity->isRunning || activity->cpuTime != last_.cpuTime ||
                        activity->written != last_.written;
  last_ = std::move(*activity);
  return isActive || isToolRunning;
}

StallWatch::Action StallWatch::Advance(Stage stage, Action action, Clock::time_point now) {
  stage_ = stage;
  nextCheck_.reset();
  if (stage != Stage::kGivenUp) {
    nextCheck_ = now + kGrace;
  }
  return action;
}

StallWatch::Action StallWatch::Check(Clock::time_point now) {
  if (!nextCheck_ || now < *nextCheck_) {
    return Action::kNone;
  }
  if (stage_ == Stage::kTerminated) {
    return Advance(Stage::kKilled, Action::kKill, now);
  }
  if (stage_ == Stage::kKilled) {
    return Advance(Stage::kGivenUp, Action::kGiveUp, now);
  }
  // When this process was suspended, velathumb probably was as well.
  const Clock::duration elapsed = std::min(now - lastCheck_, 2 * interval_);
  lastCheck_ = now;
  stalledFor_ = HasProgressed(now) ? Clock::duration(0) : stalledFor_ + elapsed;
  if (stalledFor_ >= limits_.stall) {
    return Advance(Stage::kTerminated, Action::kTerminate, now);
  }
  nextCheck_ = now + interval_;
  return Action::kNone;
}

}  // namespace vela
