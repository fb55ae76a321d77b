#include "support/child_call.h"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

namespace vela_test {

int ErrorOf(long result) {
  return result < 0 ? errno : 0;
}

int WaitStatusOf(const std::function<int()>& task) {
  const pid_t child = fork();
  if (child == 0) {
    _exit(task());
  }
  int status = 0;
  EXPECT_EQ(waitpid(child, &status, 0), child);
  return status;
}

int InChild(const std::function<int()>& task) {
  const int status = WaitStatusOf(task);
  EXPECT_TRUE(WIFEXITED(status)) << "signal " << WTERMSIG(status);
  return WEXITSTATUS(status);
}

}  // namespace vela_test
