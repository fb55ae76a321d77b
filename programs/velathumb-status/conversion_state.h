// What the conversion is doing at the moment.
#pragma once

#include <chrono>
#include <cstdint>

#include "progress_report.h"

namespace vela {

/// What the conversion is doing.
enum class Activity {
  kRunning,  ///< a velathumb is running, or velathumb-queue, which starts the next one
  kIdle,     ///< velathumb-queue is running, but has started no velathumb for a while
  kPaused,   ///< velathumb-queue may be running and have entries
  kWaiting,  ///< the queue has entries that no velathumb-queue processes yet
  kEnded,    ///< none of these
};

/// Why the conversion is paused.
enum class Pause { kNone, kResumeTime, kIndexService };

/// The progress and its cause.
struct ConversionState {
  ProgressState progress;
  Activity activity = Activity::kEnded;
  Pause pause = Pause::kNone;  ///< when paused
  ResumeState resume;          ///< when paused by the resume time
  int64_t deferred = 0;        ///< entries of the photo queue that are left for a later run

  /// Whether there is something to follow; not during a pause without a velathumb-queue and without
  /// entries.
  bool mayContinue = false;
};

/// Reads one state after the other.
class ConversionObserver {
 public:
  /// Returns the state now, never kIdle, which only time can show. Asks the index service, at most
  /// once a second, whether it has switched the conversion off, unless a velathumb is running:
  /// that one continues. An answer that a user may not have counts as no.
  ConversionState Read();

 private:
  using Clock = std::chrono::steady_clock;

  bool IsSwitchedOff();
  void FindPause(ConversionState& state);

  bool isSwitchedOff_ = false;
  Clock::time_point validUntil_;
};

/// Returns why the conversion is paused, as a line without its newline.
std::string PauseText(const ConversionState& state);

}  // namespace vela
