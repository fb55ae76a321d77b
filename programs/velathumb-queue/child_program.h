// The thumbnail maker as a child process.
#pragma once

#include <sys/types.h>

#include <string>

namespace vela {

/// How velathumb is started.
struct ChildProgram {
  std::string path;
  std::string profileFile;
};

/// Starts velathumb for one queue entry. The child ends with this process, whatever ends that. Has
/// to be called from the thread that lives as long as the process. Returns the process id, or 0
/// with `error` set to an errno value.
pid_t StartChild(const ChildProgram& program, const std::string& entry, int& error);

}  // namespace vela
