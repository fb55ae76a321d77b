// The totals of the progress counters.
#pragma once

#include <functional>
#include <set>
#include <string>
#include <vector>

#include "posix/files.h"

namespace vela {

/// Sets the totals in the progress files. A file that cannot be written is logged.
class ProgressTotals {
 public:
  /// Returns whether to stop counting.
  using StopCheck = std::function<bool()>;

  /// With `countVideos` the videos in their queue are counted too, which removes bad thumbnails and
  /// converted videos.
  explicit ProgressTotals(bool countVideos) : countVideos_(countVideos) {}

  /// Sets the counters of photos and thumbnails to 0, when work begins after an idle time.
  void Reset();

  /// Sets the totals to what is done plus what the directories of the entries still need, each
  /// directory counted once. When `shouldStop` returns true, nothing is set.
  void Set(const std::vector<std::string>& entries, const StopCheck& shouldStop);

  /// The same once more for the entries of the last Set, of which none was processed meanwhile.
  void Update(const std::vector<std::string>& entries, const StopCheck& shouldStop);

 private:
  struct Sums;

  bool Count(const std::vector<std::string>& entries, const StopCheck& shouldStop,
             Sums& sums) const;
  void Write(const Sums& sums) const;
  void CountEntry(const std::string& entry, const StopCheck& shouldStop, Sums& sums) const;
  void CountDirectory(const char* path, const StopCheck& shouldStop, Sums& sums) const;

  const bool countVideos_;
  std::set<FileIdentity> counted_;  // directories in earlier queues of this run
};

}  // namespace vela
