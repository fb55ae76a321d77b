// The daemon as a service: start, signals, stop.
#pragma once

#include "options.h"

namespace vela {

/// Runs the daemon until a signal ends it. Returns the exit status: 0, or 1 when it could not
/// start, which is then logged.
int RunService(const Options& options);

}  // namespace vela
