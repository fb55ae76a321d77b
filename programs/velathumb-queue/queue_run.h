// Works the photo queue off.
#pragma once

#include <string>
#include <vector>

#include "child_program.h"

namespace vela {

/// How the queue is worked off.
struct RunSettings {
  ChildProgram program;
  int jobs = 1;                        ///< velathumb processes at a time
  bool follow = false;                 ///< stay and wait for new entries
  bool wait = false;                   ///< for the end of another runner
  bool checkVideos = false;            ///< count waiting videos for the totals
  std::vector<std::string> additions;  ///< entries to append to the queue first
};

/// How a run ended.
enum class RunEnd {
  kEmpty,    ///< nothing waits any more
  kLeft,     ///< nothing waits but what could not be worked on
  kStopped,  ///< by a signal; entries may be left for the next run
  kFailed,   ///< told in the log; entries may be left for the next run
};

/// Works the queue off until it is empty, or with `follow` until a signal comes.
RunEnd RunQueue(const RunSettings& settings);

}  // namespace vela
