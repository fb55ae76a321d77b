// The system calls that the injection of faults watches.
#pragma once

#include <vector>

namespace vela_test {

/// Instead of an errno: the call transfers only a part of what it could.
constexpr int kShortTransfer = -1;

/// A kind of system call.
struct WatchedCall {
  int number;               ///< SYS_...
  const char* name;         ///< for messages
  int path;                 ///< argument that holds a path, -1: none
  int descriptor;           ///< argument that holds a descriptor, -1: none
  std::vector<int> errors;  ///< the ways in which it can fail
};

/// All of them: files, processes, pipes, sockets and waiting. Not among them are close (a
/// descriptor is closed even when it fails) and memory (a program without any may end).
const std::vector<WatchedCall>& WatchedCalls();

}  // namespace vela_test
