// The daemon as a service: its start, its signals and its end.
#pragma once

#include "options.h"

namespace vela {

/// Runs the daemon until a signal ends it. Returns the exit status: 0, or 1 when it could not
/// start, which is then logged.
int RunService(const Options& options);

}  // namespace vela
