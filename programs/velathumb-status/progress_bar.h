// One line that shows the progress of the conversion.
#pragma once

#include <string>

#include "progress/progress_summary.h"
#include "progress_rate.h"

namespace vela {

/// Returns the line for a terminal of `width` columns: bar, percentage, counts, rate and time left;
/// without a total only the count and the rate.
std::string FormatProgressBar(const FollowedCount& followed, const ProgressRate& rate, int width);

}  // namespace vela
