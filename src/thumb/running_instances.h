// The running instances.
#pragma once

#include <vector>

#include "posix/processes.h"

namespace vela {

/// Returns the process ids of the velathumb processes that are running, by their pid files.
std::vector<pid_t> RunningInstances();

}  // namespace vela
