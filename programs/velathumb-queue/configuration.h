// What the runner needs before it may take the queue.
#pragma once

#include <string>

#include "queue_run.h"

namespace vela {

/// The profile file of the administrator, which goes before the installed one.
inline constexpr char kLocalProfileFile[] = "/etc/velathumb/thumb-profiles.conf";

/// Returns the profile file that is used unless another one is given: `local` if anything is there,
/// even when it cannot be read, otherwise `installed`.
std::string DefaultProfileFile(const std::string& local, const std::string& installed);

/// Returns whether velathumb can read the profile file and it defines a thumbnail; otherwise the
/// reason is logged. Without a usable profile velathumb skips every directory, with exit status 0,
/// and each entry would count as done.
bool IsProfileUsable(const std::string& profileFile);

/// Returns whether velathumb can be started and has a usable profile; otherwise the reason is
/// logged.
bool IsCommandUsable(const VelathumbCommand& command);

}  // namespace vela
