#include "imagemagick/child_program.h"

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <optional>

#include "failure_line.h"
#include "write_signals.h"

namespace vela {

namespace {

constexpr int kPassedOn[] = {SIGTERM, SIGINT, SIGHUP, SIGQUIT};
constexpr int kFailed = 1;
/// What a shell says of a program that a signal has ended.
constexpr int kEndedBySignal = 128;

volatile pid_t g_child = 0;

void PassOn(int signal) {
  const int error = errno;
  kill(g_child, signal);
  errno = error;
}

sigset_t PassedOnSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  for (const int signal : kPassedOn) {
    sigaddset(&signals, signal);
  }
  return signals;
}

/// What this process was started to ignore, the program ignores as well.
void PassSignalsOn() {
  struct sigaction action = {};
  action.sa_handler = PassOn;
  action.sa_flags = SA_RESTART;
  for (const int signal : kPassedOn) {
    struct sigaction former = {};
    sigaction(signal, nullptr, &former);
    if (former.sa_handler != SIG_IGN) {
      sigaction(signal, &action, nullptr);
    }
  }
}

[[noreturn]] void BecomeProgram(const char* program, char* const* arguments, pid_t parent,
                                const sigset_t& mask) {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  // The parent may have ended before.
  if (getppid() == parent) {
    sigprocmask(SIG_SETMASK, &mask, nullptr);
    execv(program, arguments);
    TellFailure("%s: %s", program, std::strerror(errno));
    IgnoreWriteSignals();
    WriteFailureLine();
  }
  _exit(kFailed);
}

[[noreturn]] void EndLike(int waitStatus) {
  if (WIFEXITED(waitStatus)) {
    _exit(WEXITSTATUS(waitStatus));
  }
  const int signal = WTERMSIG(waitStatus);
  std::signal(signal, SIG_DFL);
  sigset_t only;
  sigemptyset(&only);
  sigaddset(&only, signal);
  sigprocmask(SIG_UNBLOCK, &only, nullptr);
  kill(getpid(), signal);
  _exit(kEndedBySignal + signal);
}

/// Where the end of children is ignored, there is nothing to wait for, and no status.
void HearOfChildren() {
  struct sigaction usual = {};
  usual.sa_handler = SIG_DFL;
  sigaction(SIGCHLD, &usual, nullptr);
}

/// Empty, with errno set, when how the child ended cannot be known.
std::optional<int> AwaitEnd(pid_t child) {
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) {
      return std::nullopt;
    }
  }
  return status;
}

}  // namespace

void StandForProgram(const char* program, char* const* arguments) {
  const pid_t self = getpid();
  const sigset_t passedOn = PassedOnSignals();
  sigset_t mask;
  // Until there is somebody to pass them on to.
  sigprocmask(SIG_BLOCK, &passedOn, &mask);
  HearOfChildren();
  const pid_t child = fork();
  if (child == 0) {
    BecomeProgram(program, arguments, self, mask);
  }
  if (child > 0) {
    g_child = child;
    PassSignalsOn();
  }
  const int error = errno;
  sigprocmask(SIG_SETMASK, &mask, nullptr);
  if (child < 0) {
    errno = error;
    return;
  }
  if (const std::optional<int> status = AwaitEnd(child)) {
    EndLike(*status);
  }
}

}  // namespace vela
