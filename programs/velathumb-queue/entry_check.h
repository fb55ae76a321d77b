// What is checked before and after velathumb runs: it silently skips what it cannot process, with
// exit status 0.
#pragma once

#include <string>

#include "entry_plan.h"

namespace vela {

/// Makes the path of an entry from the command line absolute, so that it does not depend on the
/// working directory. Returns an error message, empty when the entry is valid.
std::string CheckAddition(std::string& entry);

/// Returns why the entry cannot be processed now, empty when it can: its directory must exist, and
/// its volume have enough free space.
std::string FindObstacle(const std::string& entry);

/// Returns whether another process holds the lock on a directory of the entry: velathumb would skip
/// it.
bool IsLockedElsewhere(const EntryTarget& target);

/// Returns whether velathumb can read the profile file and it defines a thumbnail; logs when not.
/// Without a usable profile velathumb skips every directory, and each entry would count as done.
bool IsProfileUsable(const std::string& profileFile);

}  // namespace vela
