// Whether conversion may run.
#pragma once

#include <chrono>
#include <optional>
#include <string>

/// Why conversion rests, and when to ask again.
struct ConversionPause {
  std::string reason;
  std::chrono::seconds askAgain;
};

/// Returns nothing when photos may be converted now: the resume time is reached and the index
/// service has not switched conversion off.
std::optional<ConversionPause> FindConversionPause();
