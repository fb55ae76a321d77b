#include "thumb/running_instances.h"

#include <cerrno>
#include <csignal>
#include <fstream>
#include <string>

#include "posix/glob_matches.h"
#include "thumb/pid_file.h"

namespace vela {

namespace {

constexpr char kCommandName[] = "velathumb";

/// Tells whether the process runs this program: the number in a pid file that was left behind may
/// have gone to another. A process that may not be looked at has the benefit of the doubt.
bool IsInstance(pid_t pid) {
  std::ifstream file("/proc/" + std::to_string(pid) + "/comm");
  std::string name;
  if (std::getline(file, name)) {
    return name == kCommandName;
  }
  return kill(pid, 0) == 0 || errno == EPERM;
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
