// Passes the work of this process on to another program.
#pragma once

namespace vela {

/// Replaces this process by `program` with these arguments (ended by a null pointer). Returns only
/// on failure, with errno set.
void ReplaceProcess(const char* program, char* const* arguments);

/// Runs `program` in a child process and ends this process with the child's exit status or signal.
/// Forwards SIGTERM, SIGINT, SIGHUP and SIGQUIT to the child, which is killed when this process
/// dies. Resets SIGCHLD to its default action in both processes. Returns only when no child could
/// be started or its status cannot be determined, with errno set.
void RunInChildAndExit(const char* program, char* const* arguments);

}  // namespace vela
