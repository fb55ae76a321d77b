// Starting and ending child processes.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <functional>
#include <optional>

namespace vela {

/// Where a child's output goes; -1 means /dev/null.
struct ChildStreams {
  int standardOutput = -1;
  int standardError = -1;
};

/// Starts `program` (no search, no shell) with these arguments, ended by a null pointer. The child
/// reads /dev/null, has the two output descriptors and no other, default signal handling and its
/// own process group, carries the command name of the program from its first instruction on, and
/// gets SIGTERM when the calling thread ends before it. Returns 0 and stores the process id once
/// the program itself runs, or returns an errno value. The child must be handed to ReapChild.
int StartChild(const char* program, char* const arguments[], const ChildStreams& streams,
               pid_t& pid);

/// Starts a child that remains part of the calling program: it keeps the caller's standard streams,
/// inheritable descriptors, ignored signals and process group. Otherwise as StartChild.
int StartAttachedChild(const char* program, char* const arguments[], pid_t& pid);

/// Waits until the child has ended; its process id stays taken until ReapChild.
void AwaitChild(pid_t pid);

/// The same, but for at most `limit`. Returns whether the child has ended.
bool AwaitChildFor(pid_t pid, std::chrono::seconds limit);

/// Ends a child that has run beyond its time limit, with what it has started in its process group,
/// and says so in the system log. Does no more than clean up after a child that has ended.
void EndOverdueChild(pid_t pid, const char* program, std::chrono::seconds limit);

/// Takes the ended child from the process table. Returns its wait status, or -1 when another part
/// of the process has taken it.
int ReapChild(pid_t pid);

/// Does the same without waiting. Returns nothing while the child is running.
std::optional<int> ReapEndedChild(pid_t pid);

/// Takes ended children that this process has inherited from others from the process table, as the
/// first process of a container has to. `isOwn` returns true for a child of its own, which is left
/// to ReapEndedChild.
void ReapInheritedChildren(const std::function<bool(pid_t)>& isOwn);

/// Sends SIGTERM to the child alone, not to what it has started.
void TerminateChild(pid_t pid);

/// Returns whether a wait status is that of a program that exited with 0.
bool HasSucceeded(int waitStatus);

}  // namespace vela
