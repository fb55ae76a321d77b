// Whether conversion is paused by the resume time, with or without a settings file.
#pragma once

#include <chrono>

namespace vela {

/// The resume time and values derived from it.
struct ResumeState {
  long resumeTime = 0;     ///< seconds since the epoch, 0 when none is set
  bool isReached = false;  ///< conversion may run
  long waitSeconds = 0;    ///< time left, never negative
};

/// Returns the state now. Without a settings file there is no resume time, and reading it would
/// only log errors.
ResumeState ReadResumeState();

/// Returns whether conversion is paused.
bool IsPausedByResumeTime();

/// Returns the time until the resume time, 0 when it is reached or negative.
std::chrono::seconds TimeUntilResume();

}  // namespace vela
