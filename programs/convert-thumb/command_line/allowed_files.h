// The files that a command line may access.
#pragma once

#include "command_line/command_line.h"
#include "posix/landlock.h"

namespace vela {

/// Returns what a run of this command line may read and write: the photo, the directories of the
/// outputs and that for temporary files, libraries with their data, and ImageMagick. The paths need
/// not exist.
AllowedFiles FindAllowedFiles(const CommandLine& line);

}  // namespace vela
