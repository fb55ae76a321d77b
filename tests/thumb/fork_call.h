// Runs a function in a process of its own, for what must not happen to the test itself.
#pragma once

#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

#include <functional>

namespace vela_test {

/// Runs `work` in a forked child that ends with its result. Returns the exit status (0 to 255), or
/// -1 when a signal ended the child, as SIGALRM does after ten seconds.
inline int ForkCall(const std::function<int()>& work) {
  const pid_t child = fork();
  if (child == 0) {
    alarm(10);
    _exit(work());
  }
  int status = 0;
  if (child < 0 || waitpid(child, &status, 0) != child || !WIFEXITED(status)) {
    return -1;
  }
  return WEXITSTATUS(status);
}

}  // namespace vela_test
