// What the progress counters count towards.
#pragma once

#include <sys/stat.h>

#include <functional>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace vela {

/// Sets the totals in the progress files. A file that cannot be written is told in the log.
class ProgressTotals {
 public:
  /// Returns true when the counting is to be given up.
  using StopQuestion = std::function<bool()>;

  /// With `countVideos` the videos that wait are counted too, with the removals that are part of
  /// that.
  explicit ProgressTotals(bool countVideos) : countVideos_(countVideos) {}

  /// Sets the counters of photos and thumbnails to 0, for work that begins.
  void BeginAnew();

  /// Sets the totals to what is done and what the directories of the entries still need, each
  /// directory once. When it is given up, nothing is set.
  void Set(const std::vector<std::string>& entries, const StopQuestion& shouldStop);

 private:
  using Place = std::pair<dev_t, ino_t>;
  struct Sums;

  void CountEntry(const std::string& entry, const StopQuestion& shouldStop, Sums& sums) const;
  void CountDirectory(const char* path, Sums& sums) const;

  const bool countVideos_;
  std::set<Place> counted_;  // directories of this run's earlier queues
};

}  // namespace vela
