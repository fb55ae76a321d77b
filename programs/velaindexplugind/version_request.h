// The command line's side of setting index versions.
#pragma once

#include "options.h"

namespace vela {

/// Asks the running daemon to do what the options say about a directory's index version. Returns
/// the exit status: 0, or 1 when it did not, which is then told on standard error.
int RequestVersion(const Options& options);

}  // namespace vela
