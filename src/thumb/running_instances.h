// The running instances of the program.
#pragma once

#include <vector>

#include "posix/processes.h"

namespace vela {

/// Returns the process ids of the running velathumb processes, according to their pid files.
std::vector<pid_t> RunningInstances();

}  // namespace vela
