// What the runner needs before it may take the queue.
#pragma once

#include <functional>
#include <string>

#include "queue_run.h"

namespace vela {

/// Whether velathumb can read the profile file and it defines a thumbnail.
enum class ProfileState {
  kUsable,
  kUsableNow,    ///< not when it was looked at first
  kUnusable,     ///< the reason is logged
  kInterrupted,  ///< not at first, and the wait for a second look was ended
};

/// Returns the state of the profile. One that is not usable may just be being written, so it is
/// looked at again after a second, unless `mustStop` returns true meanwhile. Without a usable
/// profile velathumb skips every directory, with exit status 0, and each entry would count as done.
ProfileState CheckProfileUse(const std::string& profileFile, const std::function<bool()>& mustStop);

/// Returns whether velathumb can be started and has a usable profile, with the same second look;
/// otherwise the reason is logged.
bool IsCommandUsable(const VelathumbCommand& command);

}  // namespace vela
