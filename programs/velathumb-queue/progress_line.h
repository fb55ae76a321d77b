// The line that shows on a terminal how far the work is.
#pragma once

#include <chrono>
#include <string>

#include "progress/progress_summary.h"

namespace vela {

/// Returns the line for a terminal of `width` columns: percentage and number of the thumbnails, or
/// of the photos when the total of the thumbnails is not known, and the directory in progress. A
/// path that does not fit loses its beginning.
std::string FormatProgressLine(const ProgressSummary& summary, const std::string& directory,
                               int width);

/// Returns the directory that the velathumb `pid` holds open to work in; empty when there is none,
/// or it cannot be seen.
std::string DirectoryInProgress(long pid);

/// Shows the progress while the object exists, if standard error is a terminal.
class ProgressLine {
 public:
  /// How often it has to be updated.
  static constexpr std::chrono::milliseconds kInterval{500};

  ProgressLine();
  ~ProgressLine();
  ProgressLine(const ProgressLine&) = delete;
  ProgressLine& operator=(const ProgressLine&) = delete;

  /// Returns false when nothing can be shown.
  bool IsShown() const { return isShown_; }

  /// Shows the progress of the velathumb `pid`, which processes the entry `entry`.
  void Update(long pid, const std::string& entry) const;

  /// Shows nothing until the next update.
  void Hide() const;

 private:
  const bool isShown_;
};

}  // namespace vela
