// The progress of the conversion, and whether it is paused.
#pragma once

#include <json/value.h>

#include <iosfwd>
#include <string>
#include <vector>

#include "progress/progress_summary.h"
#include "progress/resume_state.h"

namespace vela {

/// The counters and the running velathumb processes.
struct ProgressState {
  ProgressSummary summary;
  std::vector<pid_t> instances;  ///< process ids

  /// Returns true when a counter has not reached its total.
  bool HasWork() const;
};

ProgressState ReadProgressState();

void WriteProgressText(std::ostream& out, const ProgressState& state);
Json::Value DescribeProgress(const ProgressState& state);

/// Returns whether and until when conversion is paused, as a line without its newline.
std::string ResumeText(const ResumeState& state);
Json::Value DescribeResume(const ResumeState& state);

}  // namespace vela
