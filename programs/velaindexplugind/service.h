// The daemon as a service: start, signals, stop.
#pragma once

#include "options.h"

namespace vela {

/// Runs the daemon until a signal ends it. Returns the exit status: 0, or, when it could not start,
/// which is then logged, 78 if only an administrator can change that and 1 otherwise.
int RunService(const Options& options);

}  // namespace vela
