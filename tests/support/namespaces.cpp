#include "support/namespaces.h"

#include <fcntl.h>
#include <sched.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string>

#include "support/descriptor.h"
#include "support/environment_failure.h"

namespace vela_test {

namespace {

void WriteControlFile(const char* path, const std::string& text) {
  const Descriptor file(open(path, O_WRONLY | O_CLOEXEC));
  if (!file.IsOpen() ||
      write(file.Get(), text.data(), text.size()) != static_cast<ssize_t>(text.size())) {
    EnvironmentFailureWithErrno(std::string("cannot write ") + path);
  }
}

void UnshareAsOrdinaryUser() {
  const std::string user = std::to_string(geteuid());
  const std::string group = std::to_string(getegid());
  if (unshare(CLONE_NEWUSER | CLONE_NEWNS | CLONE_NEWPID) != 0) {
    EnvironmentFailureWithErrno("cannot make the user namespace of the sandbox");
  }
  WriteControlFile("/proc/self/setgroups", "deny");
  WriteControlFile("/proc/self/uid_map", "0 " + user + " 1");
  WriteControlFile("/proc/self/gid_map", "0 " + group + " 1");
}

void Unshare() {
  if (unshare(CLONE_NEWNS | CLONE_NEWPID) == 0) {
    return;
  }
  if (errno != EPERM) {
    EnvironmentFailureWithErrno("cannot make the namespaces of the sandbox");
  }
  UnshareAsOrdinaryUser();
}

pid_t Fork() {
  const pid_t child = fork();
  if (child < 0) {
    EnvironmentFailureWithErrno("cannot start a process of the sandbox");
  }
  return child;
}

/// Waits for one child across interruptions; returns its wait status.
int AwaitChild(pid_t child) {
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) {
      EnvironmentFailureWithErrno("cannot wait for the sandbox");
    }
  }
  return status;
}

int ExitStatusOf(int waitStatus) {
  if (WIFEXITED(waitStatus)) {
    return WEXITSTATUS(waitStatus);
  }
  return 128 + WTERMSIG(waitStatus);
}

/// Process 1 takes over every orphan of the sandbox and ends with the test process.
[[noreturn]] void Reap(pid_t testProcess) {
  for (;;) {
    int status = 0;
    const pid_t ended = waitpid(-1, &status, 0);
    if (ended == testProcess) {
      if (WIFSIGNALED(status)) {
        std::fprintf(stderr, "test process ended by signal %d (%s)\n", WTERMSIG(status),
                     strsignal(WTERMSIG(status)));
      }
      _exit(ExitStatusOf(status));
    }
    if (ended < 0 && errno != EINTR) {
      _exit(1);
    }
  }
}

/// Makes process 1 end with its parent, even if the parent has already ended.
void EndWithParent(const Descriptor& alive) {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  char byte = 0;
  if (read(alive.Get(), &byte, 1) != 1) {
    _exit(1);
  }
}

}  // namespace

void EnterNamespaces(const std::function<void()>& prepare) {
  Unshare();
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) {
    EnvironmentFailureWithErrno("cannot make a pipe");
  }
  Descriptor alive(ends[0]);
  Descriptor aliveWriter(ends[1]);
  const pid_t init = Fork();
  if (init > 0) {
    alive.Close();
    const ssize_t written = write(aliveWriter.Get(), "", 1);
    static_cast<void>(written);  // process 1 sees the closed pipe otherwise
    aliveWriter.Close();
    _exit(ExitStatusOf(AwaitChild(init)));
  }
  aliveWriter.Close();
  EndWithParent(alive);
  prctl(PR_SET_NAME, "sandbox");
  prepare();
  const pid_t testProcess = Fork();
  if (testProcess > 0) {
    Reap(testProcess);
  }
  prctl(PR_SET_NAME, "sandbox-test");
}

}  // namespace vela_test
