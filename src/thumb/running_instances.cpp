#include "thumb/running_instances.h"

#include <fstream>
#include <string>

#include "posix/glob_matches.h"
#include "posix/processes.h"
#include "thumb/pid_file.h"

namespace vela {

namespace {

constexpr char kCommandName[] = "velathumb";

/// Returns true when the process runs this program: the number in a stale pid file may belong to
/// another program by now. A process that may not be examined counts as one.
bool IsInstance(pid_t pid) {
  std::ifstream file("/proc/" + std::to_string(pid) + "/comm");
  std::string name;
  if (std::getline(file, name)) {
    return name == kCommandName;
  }
  return StateOfProcess(pid) != ProcessState::kGone;
}

}  // namespace

std::vector<pid_t> RunningInstances() {
  std::vector<pid_t> instances;
  for (const char* path : GlobMatches(kPidFilePattern)) {
    const auto pid = static_cast<pid_t>(PidOfFile(path));
    if (pid > 0 && IsInstance(pid)) {
      instances.push_back(pid);
    }
  }
  return instances;
}

}  // namespace vela
