#include "process/child_program.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <optional>
#include <utility>

#include "posix/file_content.h"
#include "posix/file_descriptor.h"
#include "process/failure_report.h"
#include "process/idle_time.h"
#include "process/write_signals.h"

namespace vela {

namespace {

constexpr int kForwardedSignals[] = {SIGTERM, SIGINT, SIGHUP, SIGQUIT};
constexpr int kFailed = 1;
/// Added to a signal number, the exit status that shells report for a program ended by a signal.
constexpr int kEndedBySignal = 128;

/// Bytes of the child's messages that are kept.
constexpr size_t kMostErrors = 65536;

volatile pid_t g_child = 0;
volatile std::sig_atomic_t g_isStopped = 0;

/// The processor time of the child; set before the first look at it.
clockid_t g_childClock = 0;
IdleTime g_childIdleTime;
volatile std::sig_atomic_t g_isIdle = 0;

/// Two ends of a pipe.
struct Pipe {
  FileDescriptor reader;
  FileDescriptor writer;
};

/// Neither end is open, and errno is set, on failure.
Pipe MakePipe() {
  int ends[2] = {-1, -1};
  return pipe2(ends, O_CLOEXEC) == 0 ? Pipe{FileDescriptor(ends[0]), FileDescriptor(ends[1])}
                                     : Pipe{};
}

/// Passes everything from the pipe on to standard error, until the child has closed it. Returns its
/// beginning.
std::string PassErrorsOn(const FileDescriptor& reader) {
  std::string errors;
  char chunk[4096];
  size_t got = 0;
  while (ReadChunk(reader.Get(), chunk, sizeof chunk, got) == 0 && got > 0) {
    WriteAll(STDERR_FILENO, {chunk, got});
    errors.append(chunk, std::min(got, kMostErrors - errors.size()));
  }
  return errors;
}

void ForwardSignal(int signal) {
  const int error = errno;
  g_isStopped = 1;
  kill(g_child, signal);
  errno = error;
}

sigset_t ForwardedSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  for (const int signal : kForwardedSignals) {
    sigaddset(&signals, signal);
  }
  return signals;
}

/// Signals that this process ignores stay ignored: the child inherits that.
void ForwardSignals() {
  struct sigaction action = {};
  action.sa_handler = ForwardSignal;
  action.sa_flags = SA_RESTART;
  for (const int signal : kForwardedSignals) {
    struct sigaction former = {};
    sigaction(signal, nullptr, &former);
    if (former.sa_handler != SIG_IGN) {
      sigaction(signal, &action, nullptr);
    }
  }
}

/// Called every second.
void LookAtChild(int) {
  const int error = errno;
  timespec used = {};
  if (clock_gettime(g_childClock, &used) == 0 &&
      g_childIdleTime.Update(used.tv_sec, used.tv_nsec) >= kMostIdleSeconds) {
    g_isIdle = 1;
    kill(g_child, SIGKILL);
  }
  errno = error;
}

void SetTimer(time_t seconds) {
  const itimerval timer = {{seconds, 0}, {seconds, 0}};
  setitimer(ITIMER_REAL, &timer, nullptr);
}

/// Kills the child when it stops working: without memory, ImageMagick 7 waits for its own lock
/// forever. It is a signal that looks at the child, because there may be no memory for a thread.
void WatchChild() {
  if (clock_getcpuclockid(g_child, &g_childClock) != 0) {
    return;
  }
  struct sigaction action = {};
  action.sa_handler = LookAtChild;
  action.sa_flags = SA_RESTART;
  sigaction(SIGALRM, &action, nullptr);
  sigset_t alarm;
  sigemptyset(&alarm);
  sigaddset(&alarm, SIGALRM);
  sigprocmask(SIG_UNBLOCK, &alarm, nullptr);
  SetTimer(1);
}

[[noreturn]] void Execute(const std::vector<const char*>& programs, char* const* arguments,
                          pid_t parent, const sigset_t& mask, const FileDescriptor& errors) {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  // The parent may have ended before that call.
  if (getppid() == parent && dup2(errors.Get(), STDERR_FILENO) >= 0) {
    sigprocmask(SIG_SETMASK, &mask, nullptr);
    for (const char* const program : programs) {
      execv(program, arguments);
    }
    std::fprintf(stderr, "convert-thumb: %s: %s\n", programs.back(), std::strerror(errno));
  }
  _exit(kFailed);
}

[[noreturn]] void ExitAs(int waitStatus, std::string errors,
                         const std::function<bool(const ChildEnd&)>& finish) {
  ChildEnd end;
  end.succeeded = WIFEXITED(waitStatus) && WEXITSTATUS(waitStatus) == 0;
  end.signal = WIFSIGNALED(waitStatus) ? WTERMSIG(waitStatus) : 0;
  end.wasStopped = g_isStopped != 0;
  end.wasIdle = g_isIdle != 0 && !end.wasStopped;
  end.errors = std::move(errors);
  if (!finish(end) && (end.succeeded || end.wasIdle)) {
    PrintFailure();
    _exit(kFailed);
  }
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

/// A process that ignores SIGCHLD gets no exit status of its children.
void ResetChildSignal() {
  struct sigaction action = {};
  action.sa_handler = SIG_DFL;
  sigaction(SIGCHLD, &action, nullptr);
}

/// Returns the wait status of the child; empty, with errno set, when it cannot be determined.
std::optional<int> WaitForExit(pid_t child) {
  siginfo_t end;
  // Only its process id is not reused yet.
  while (waitid(P_PID, static_cast<id_t>(child), &end, WEXITED | WNOWAIT) < 0 && errno == EINTR) {
  }
  SetTimer(0);
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) {
      return std::nullopt;
    }
  }
  return status;
}

}  // namespace

void ReplaceProcess(const char* program, char* const* arguments) {
  execv(program, arguments);
}

void RunInChildAndExit(const std::vector<const char*>& programs, char* const* arguments,
                       const std::function<bool(const ChildEnd&)>& finish) {
  Pipe errors = MakePipe();
  if (!errors.reader.IsOpen()) {
    return;
  }
  const pid_t self = getpid();
  const sigset_t forwarded = ForwardedSignals();
  sigset_t mask;
  // Blocked until there is a child to forward them to.
  sigprocmask(SIG_BLOCK, &forwarded, &mask);
  ResetChildSignal();
  const pid_t child = fork();
  if (child == 0) {
    Execute(programs, arguments, self, mask, errors.writer);
  }
  if (child > 0) {
    g_child = child;
    ForwardSignals();
  }
  const int error = errno;
  sigprocmask(SIG_SETMASK, &mask, nullptr);
  if (child < 0) {
    errno = error;
    return;
  }
  errors.writer.Reset();
  // Standard error may be broken, and the outputs must be removed nevertheless.
  IgnoreWriteSignals();
  WatchChild();
  std::string messages = PassErrorsOn(errors.reader);
  if (const std::optional<int> status = WaitForExit(child)) {
    ExitAs(*status, std::move(messages), finish);
  }
}

}  // namespace vela
