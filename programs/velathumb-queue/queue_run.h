// Processes the photo queue.
#pragma once

#include <string>
#include <vector>

namespace vela {

/// How velathumb is started.
struct VelathumbCommand {
  std::string path;
  std::string profileFile;
};

/// How the queue is processed.
struct RunSettings {
  VelathumbCommand velathumb;
  int jobs = 1;                        ///< velathumb processes at a time
  bool follow = false;                 ///< keep running and wait for new entries
  bool wait = false;                   ///< wait for the end of another runner
  bool now = false;                    ///< process the additions here, also with a service
  bool queueOnly = false;              ///< leave the additions to others
  bool checkVideos = false;            ///< count the queued videos for the totals
  std::vector<std::string> additions;  ///< entries to append to the queue first
};

/// How a run ended.
enum class RunEnd {
  kEmpty,         ///< the queue is empty
  kDeferred,      ///< only entries that could not be processed are left
  kStopped,       ///< by a signal; entries may be left for the next run
  kFailed,        ///< the reason is logged; entries may be left for the next run
  kNotRecorded,   ///< the same, because a file of the queue cannot be read or written
  kMisconfigured  ///< the same, because velathumb would do nothing with this profile
};

/// Processes the queue until it is empty, or with `follow` until a signal is received.
RunEnd RunQueue(const RunSettings& settings);

}  // namespace vela
