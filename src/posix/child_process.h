// Starting and ending child processes.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <functional>
#include <optional>

#include "posix/confinement.h"

namespace vela {

/// Where a child's output goes; -1 means /dev/null.
struct ChildStreams {
  int standardOutput = -1;
  int standardError = -1;
};

/// Starts `program` (no PATH search, no shell) with these arguments, ended by a null pointer. The
/// child reads /dev/null, has no descriptors besides the two outputs, default signal handling, its
/// own process group and, from the start, the command name of the program. It runs as the user with
/// whose rights the calling thread accesses files (see identity.h) and gets SIGTERM when that
/// thread ends before it. It inherits no environment: it gets PATH, LC_ALL, HOME and the variables
/// of `confinement`, which it enters before the program runs. Returns 0 and stores the process id
/// once the program itself runs, or returns an errno value. The child must be handed to ReapChild.
int StartChild(const char* program, char* const arguments[], const ChildStreams& streams,
               const Confinement& confinement, pid_t& pid);

/// Starts a child that remains part of the calling program: it keeps the caller's standard streams,
/// inheritable descriptors, ignored signals, process group and environment, and is not confined.
/// Otherwise as StartChild.
int StartAttachedChild(const char* program, char* const arguments[], pid_t& pid);

/// Waits until the child has ended; its process id is not reused before ReapChild.
void AwaitChild(pid_t pid);

/// The same, but for at most `limit`. Returns whether the child has ended.
bool AwaitChildFor(pid_t pid, std::chrono::seconds limit);

/// Kills a child that has exceeded its time limit, with its process group, and logs that. Of a
/// child that has ended, kills only the process group and logs nothing.
void KillOverdueChild(pid_t pid, const char* program, std::chrono::seconds limit);

/// Kills what an ended child has left running in its process group. Must be called before the child
/// is reaped: until then the group is not another one.
void KillGroup(pid_t pid);

/// Waits for the child and reaps it. Returns its wait status, or -1 when another part of the
/// process has reaped it.
int ReapChild(pid_t pid);

/// Does the same without waiting. Returns nothing while the child is running.
std::optional<int> ReapEndedChild(pid_t pid);

/// Reaps ended children that this process has inherited, as the first process of a container has
/// to. `isOwn` returns true for a child that this process has started, which is left to
/// ReapEndedChild.
void ReapInheritedChildren(const std::function<bool(pid_t)>& isOwn);

/// Sends SIGTERM to the child alone, not to its descendants.
void TerminateChild(pid_t pid);

/// Kills the child alone, unless it has ended.
void KillChild(pid_t pid);

/// Returns whether a wait status is that of a program that exited with 0.
bool HasSucceeded(int waitStatus);

}  // namespace vela
