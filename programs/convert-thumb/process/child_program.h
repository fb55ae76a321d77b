// Passes the work of this process on to another program.
#pragma once

#include <functional>
#include <string>
#include <vector>

namespace vela {

/// Replaces this process by `program` with these arguments (ended by a null pointer). Returns only
/// on failure, with errno set.
void ReplaceProcess(const char* program, char* const* arguments);

/// A disk that has to start, or a file server that is replaced by another, takes less.
constexpr int kMostIdleSeconds = 180;

/// How a child has ended.
struct ChildEnd {
  bool succeeded = false;   ///< its exit status is 0
  int signal = 0;           ///< that ended it; 0: none
  bool wasStopped = false;  ///< a signal was forwarded to it; it may have ended in any way then
  bool wasIdle = false;     ///< it was killed because it had stopped working
  std::string errors;       ///< the beginning of what it has written to standard error
};

/// Runs the first of these programs that can be started in a child process and ends this process
/// with the child's exit status or signal. What the child writes to standard error is passed on.
/// When the child has ended, calls `finish`; if its exit status is 0 and `finish` returns false,
/// this process prints the failure and ends with status 1. The same happens when the child has been
/// killed because none of its threads used a processor for kMostIdleSeconds. Forwards SIGTERM,
/// SIGINT, SIGHUP and SIGQUIT to the child, which is killed when this process dies. Resets SIGCHLD
/// to its default action in both processes; in this one, uses SIGALRM and ignores the signals of
/// IgnoreWriteSignals. Returns only when no child could be started or its status cannot be
/// determined, with errno set.
void RunInChildAndExit(const std::vector<const char*>& programs, char* const* arguments,
                       const std::function<bool(const ChildEnd&)>& finish);

}  // namespace vela
