// Setting index versions from the command line.
#pragma once

#include "options.h"

namespace vela {

/// Asks the running daemon to set or remove a directory's index version, as the options say.
/// Returns the exit status: 0 on success, otherwise 1 with a message on standard error.
int RequestVersion(const Options& options);

}  // namespace vela
