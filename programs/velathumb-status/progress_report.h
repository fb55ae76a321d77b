// How far the conversion has come, and whether it is held back.
#pragma once

#include <json/value.h>
#include <sys/types.h>

#include <iosfwd>
#include <vector>

#include "progress/progress_summary.h"

namespace vela {

/// The counters and who is at work.
struct ProgressState {
  ProgressSummary summary;
  std::vector<pid_t> instances;

  /// Returns true when a counter has not reached its total.
  bool HasWork() const;
};

ProgressState ReadProgressState();

void WriteProgressText(std::ostream& out, const ProgressState& state);
Json::Value DescribeProgress(const ProgressState& state);

/// The time until which conversion rests.
struct ResumeState {
  long resumeTime = 0;     ///< seconds since the epoch, 0 when none is set
  bool isReached = false;  ///< conversion may run
  long waitSeconds = 0;    ///< time left, never negative
};

ResumeState ReadResumeState();

void WriteResumeText(std::ostream& out, const ResumeState& state);
Json::Value DescribeResume(const ResumeState& state);

}  // namespace vela
