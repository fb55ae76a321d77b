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

  /// Returns the completed part of `whole`, rounded down: the full value is not shown before the
  /// end. From 0 to `whole` even when the counters are inconsistent; only with a total.
  int PartOf(int whole) const;
};

/// All counters.
struct ProgressSummary {
  ProgressCount photo;
  ProgressCount thumb;
  ProgressCount video;
};

/// The counter that shows the progress best: that of the thumbnails, or of the photos when the
/// total of the thumbnails is not known.
struct FollowedCount {
  const char* unit;
  ProgressCount count;
};
FollowedCount ChooseCount(const ProgressSummary& summary);

/// Reads the counters; one that is missing or not a number counts as 0.
ProgressSummary ReadProgressSummary();

/// Returns the summary as lines of text, a heading first.
std::vector<std::string> FormatProgressSummary(const ProgressSummary& summary);

}  // namespace vela
