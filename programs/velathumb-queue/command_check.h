// What the runner needs before it may take the queue.
#pragma once

#include <string>

#include "queue_run.h"

namespace vela {

/// Returns whether velathumb can read the profile file and it defines a thumbnail; otherwise the
/// reason is logged. Without a usable profile velathumb skips every directory, with exit status 0,
/// and each entry would count as done.
bool IsProfileUsable(const std::string& profileFile);

/// Returns whether velathumb can be started and has a usable profile; otherwise the reason is
/// logged.
bool IsCommandUsable(const VelathumbCommand& command);

}  // namespace vela
