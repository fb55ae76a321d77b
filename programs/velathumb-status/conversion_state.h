// What the conversion is doing at the moment.
#pragma once

#include "progress_report.h"

namespace vela {

/// What the conversion is doing.
enum class Activity {
  kRunning,  ///< a velathumb is running, or velathumb-queue, which starts the next one
  kPaused,   ///< until the resume time; velathumb-queue may be running and have entries
  kWaiting,  ///< the queue has entries that no velathumb-queue processes yet
  kEnded,    ///< none of these
};

/// The progress and its cause.
struct ConversionState {
  ProgressState progress;
  Activity activity = Activity::kEnded;
  ResumeState resume;  ///< when paused

  /// Whether there is something to follow; not during a pause without a velathumb-queue and without
  /// entries.
  bool mayContinue = false;
};

ConversionState ReadConversionState();

}  // namespace vela
