// Pid files and termination by SIGTERM.
#pragma once

#include <string>

/// Creates the empty pid file of this process and returns its path, also on failure, which is
/// logged.
std::string CreatePidFile();

/// Removes stale pid files; kills no process. Failures are logged.
void KillThumbProcesses();

/// The SIGTERM handler: removes the pid file, ends the running converters and exits with status 1.
/// Async-signal-safe.
void OnSigTerm(int signal);
