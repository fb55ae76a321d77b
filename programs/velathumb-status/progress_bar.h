// One line that shows the progress of the conversion.
#pragma once

#include <string>

#include "progress_rate.h"
#include "progress_report.h"

namespace vela {

/// The counter that a bar shows: that of the thumbnails, or of the photos when the total of the
/// thumbnails is not known.
struct FollowedCount {
  const char* unit;
  ProgressCount count;
};
FollowedCount ChooseCount(const ProgressSummary& summary);

/// Returns the line for a terminal of `width` columns: bar, percentage, counts, rate and time left;
/// without a total only the count and the rate.
std::string FormatProgressBar(const FollowedCount& followed, const ProgressRate& rate, int width);

}  // namespace vela
