// All counters of conversion progress.
#pragma once

#include <string>
#include <vector>

namespace vela {

/// Returns the path of the progress file of a media kind (a THUMB_TYPE), null for an unknown one.
const char* ConvProgressFile(int kind);

/// The progress of one kind of work.
struct ProgressCount {
  int total;
  int completed;

  /// Returns completed divided by total, from 0 to 1 unless the counters are inconsistent; 0
  /// without a total.
  float Ratio() const {
    return total == 0 ? 0.0F : static_cast<float>(completed) / static_cast<float>(total);
  }
};

/// All counters.
struct ProgressSummary {
  ProgressCount photo;
  ProgressCount thumb;
  ProgressCount video;
};

/// Reads the counters; one that is missing or not a number counts as 0.
ProgressSummary ReadProgressSummary();

/// Returns the summary as lines of text, a heading first.
std::vector<std::string> FormatProgressSummary(const ProgressSummary& summary);

}  // namespace vela
