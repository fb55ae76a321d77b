// Pid files and the end of the process by SIGTERM.
#pragma once

#include <string>

/// Makes the empty pid file of this process and returns its path, also when it could not be made,
/// which is logged.
std::string CreatePidFile();

/// Removes stale pid files; kills nothing. A removal that fails
/// is logged.
void KillThumbProcesses();

/// The SIGTERM handler: removes the pid file, ends the running converters and exits with status 1.
/// Async-signal-safe.
void OnSigTerm(int signal);
