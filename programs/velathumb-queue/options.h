// The command line.
#pragma once

#include "cli/command_line.h"
#include "queue_run.h"

namespace vela {

/// Parses the command line into `settings`.
ParseOutcome ParseOptions(int argc, char** argv, RunSettings& settings);

}  // namespace vela
