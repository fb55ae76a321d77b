// The paths that a command line may write to.
#pragma once

#include "command_line/command_line.h"
#include "posix/landlock.h"

namespace vela {

/// Returns the directories of the outputs, the directory for temporary files and /dev/null. The
/// paths need not exist.
WritablePaths FindWritablePaths(const CommandLine& line);

}  // namespace vela
