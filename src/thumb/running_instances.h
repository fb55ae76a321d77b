// Which instances are at work.
#pragma once

#include <sys/types.h>

#include <vector>

namespace vela {

/// Returns the process ids of the velathumb processes that are running, by their pid files.
std::vector<pid_t> RunningInstances();

}  // namespace vela
