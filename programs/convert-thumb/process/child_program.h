// Passes the work of this process on to another program.
#pragma once

#include <functional>
#include <vector>

namespace vela {

/// Replaces this process by `program` with these arguments (ended by a null pointer). Returns only
/// on failure, with errno set.
void ReplaceProcess(const char* program, char* const* arguments);

/// Runs the first of these programs that can be started in a child process and ends this process
/// with the child's exit status or signal. When the child has ended, calls `finish` with true if
/// its exit status is 0; if `finish` then returns false, this process prints the failure and ends
/// with status 1. Forwards SIGTERM, SIGINT, SIGHUP and SIGQUIT to the child, which is killed when
/// this process dies. Resets SIGCHLD to its default action in both processes. Returns only when no
/// child could be started or its status cannot be determined, with errno set.
void RunInChildAndExit(const std::vector<const char*>& programs, char* const* arguments,
                       const std::function<bool(bool)>& finish);

}  // namespace vela
