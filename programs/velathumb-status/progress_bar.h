// One line that shows how far the conversion has come.
#pragma once

#include <string>

#include "progress_rate.h"
#include "progress_report.h"

namespace vela {

/// The counter that a bar follows: that of the thumbnails, or of the photos when nobody has said
/// how many thumbnails there will be.
struct FollowedCount {
  const char* unit;
  ProgressCount count;
};
FollowedCount ChooseCount(const ProgressSummary& summary);

/// Returns the line for a terminal of `width` columns: bar, share, counts, rate and time left;
/// without a total only what has been made and the rate.
std::string FormatProgressBar(const FollowedCount& followed, const ProgressRate& rate, int width);

}  // namespace vela
