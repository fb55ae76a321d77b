#include "platform/forked_call.h"

#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <fstream>
#include <string>

#include "support/files.h"

namespace platform_test {

namespace {

/// State letter and parent of a process, from its line in the process table.
bool IsZombieOf(const std::string& pid, pid_t parent) {
  std::ifstream file("/proc/" + pid + "/stat");
  std::string line;
  std::getline(file, line);
  const size_t end = line.rfind(')');
  if (end == std::string::npos || end + 4 >= line.size() || line[end + 2] != 'Z') return false;
  return std::stoi(line.substr(end + 4)) == parent;
}

}  // namespace

pid_t Fork(const std::function<int()>& call) {
  const pid_t pid = fork();
  if (pid == 0) _exit(call());
  return pid;
}

int Join(pid_t pid) {
  int status = 0;
  while (waitpid(pid, &status, 0) < 0) {
    if (errno != EINTR) return -1000;
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

int RunForked(const std::function<int()>& call) {
  return Join(Fork(call));
}

int CountZombies() {
  int count = 0;
  for (const std::string& name : vela_test::ListDirectory("/proc")) {
    const bool isPid = name.find_first_not_of("0123456789") == std::string::npos;
    if (isPid && IsZombieOf(name, getpid())) ++count;
  }
  return count;
}

int CountDescriptors() {
  return static_cast<int>(vela_test::ListDirectory("/proc/self/fd").size());
}

}  // namespace platform_test
