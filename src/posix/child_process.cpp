#include "posix/child_process.h"

#include <fcntl.h>
#include <linux/futex.h>
#include <poll.h>
#include <sched.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstring>
#include <memory>
#include <new>
#include <string>
#include <vector>

#include "posix/child_status_keeper.h"
#include "posix/deadline.h"
#include "posix/event_wait.h"
#include "posix/file_descriptor.h"
#include "posix/identity.h"
#include "posix/log.h"
#include "posix/signal_block.h"

namespace vela {

namespace {

constexpr int kFirstOtherDescriptor = STDERR_FILENO + 1;
constexpr size_t kCommandNameSize = 16;
constexpr size_t kChildStackSize = 64 * 1024;
/// For a child to run its program.
constexpr std::chrono::seconds kStartLimit{10};

/// The environment of every confined child.
constexpr const char* kEnvironment[] = {"PATH=/usr/sbin:/usr/bin:/sbin:/bin", "LC_ALL=C", "HOME=/"};

/// The child's task, in memory that it shares with its parent until the program runs.
struct ChildPlan {
  const char* program;
  char* const* arguments;
  const ChildStreams* streams;             ///< null for a child that keeps those of its parent
  const PreparedConfinement* confinement;  ///< null for a child that is not confined
  char* const* environment;
  pid_t parent;
  char commandName[kCommandNameSize];
  int error;
};

// From here to RunChild: runs in the child before exec, in the parent's memory. System calls only.

/// No handler of the parent may run in the child, which shares the parent's memory.
void SetDefaultSignals(bool keepIgnored) {
  struct sigaction action;
  memset(&action, 0, sizeof(action));
  action.sa_handler = SIG_DFL;
  for (int number = 1; number < NSIG; ++number) {
    struct sigaction old;
    const bool isKept =
        keepIgnored && sigaction(number, nullptr, &old) == 0 && old.sa_handler == SIG_IGN;
    if (!isKept) {
      sigaction(number, &action, nullptr);
    }
  }
}

/// Copies `fd` out of the way of the standard descriptors; if it is not open, copies `fallback`.
/// Returns the copy, or -1 with errno set.
int CopyAside(int fd, int fallback) {
  const int copy = fd < 0 ? -1 : fcntl(fd, F_DUPFD_CLOEXEC, kFirstOtherDescriptor);
  if (copy >= 0) {
    return copy;
  }
  if (fd >= 0 && errno != EBADF) {
    return -1;
  }
  return fcntl(fallback, F_DUPFD_CLOEXEC, kFirstOtherDescriptor);
}

bool SetStreams(const ChildStreams& streams) {
  const int null = open("/dev/null", O_RDWR | O_CLOEXEC);
  if (null < 0) {
    return false;
  }
  const int input = CopyAside(null, null);
  const int output = CopyAside(streams.standardOutput, null);
  const int error = CopyAside(streams.standardError, null);
  if (input < 0 || output < 0 || error < 0) {
    return false;
  }
  if (dup2(input, STDIN_FILENO) < 0 || dup2(output, STDOUT_FILENO) < 0) {
    return false;
  }
  return dup2(error, STDERR_FILENO) >= 0;
}

bool EndWithParent(pid_t parent) {
  if (prctl(PR_SET_PDEATHSIG, SIGTERM) != 0) {
    return false;
  }
  // The parent may have been killed before the call above.
  if (getppid() == parent) {
    return true;
  }
  errno = ESRCH;
  return false;
}

bool UnblockSignals() {
  sigset_t none;
  sigemptyset(&none);
  return sigprocmask(SIG_SETMASK, &none, nullptr) == 0;
}

/// Returns an errno value; does not return once the program runs.
int BecomeProgram(const ChildPlan& plan) {
  const bool isAttached = plan.streams == nullptr;
  SetDefaultSignals(isAttached);
  // The kernel sets this name only at the end of exec, when the parent is already running again:
  // until then a search for the program's name would miss the child.
  prctl(PR_SET_NAME, plan.commandName);
  // Before the next call, whose setting the kernel drops with the rights.
  if (const int error = BecomeFileUser(); error != 0) {
    return error;
  }
  if (!EndWithParent(plan.parent)) {
    return errno;
  }
  if (!isAttached && setpgid(0, 0) != 0) {
    return errno;
  }
  if (!isAttached && !SetStreams(*plan.streams)) {
    return errno;
  }
  const int error = plan.confinement == nullptr ? 0 : plan.confinement->Enter();
  if (error != 0) {
    return error;
  }
  if (!isAttached) {
    // Also descriptors that this program has inherited itself.
    closefrom(kFirstOtherDescriptor);
  }
  if (!UnblockSignals()) {
    return errno;
  }
  execve(plan.program, plan.arguments, plan.environment);
  return errno;
}

int RunChild(void* data) {
  auto* plan = static_cast<ChildPlan*>(data);
  plan->error = BecomeProgram(*plan);
  _exit(127);
}

void SetCommandName(ChildPlan& plan) {
  const char* slash = strrchr(plan.program, '/');
  strncpy(plan.commandName, slash == nullptr ? plan.program : slash + 1, kCommandNameSize - 1);
}

/// Returns pointers to the environment of a confined child, ended by a null pointer.
std::vector<char*> MakeEnvironment(const Confinement& confinement) {
  std::vector<char*> environment;
  for (const char* const variable : kEnvironment) {
    environment.push_back(const_cast<char*>(variable));
  }
  for (const std::string& variable : confinement.environment) {
    environment.push_back(const_cast<char*>(variable.c_str()));
  }
  environment.push_back(nullptr);
  return environment;
}

/// Waits until the kernel clears `isSharing`, which it does when the child stops sharing its
/// parent's memory. Returns false when that has not happened within `limit`.
bool AwaitOwnMemory(const std::atomic<int>& isSharing, std::chrono::seconds limit) {
  const Deadline deadline(limit);
  while (isSharing != 0) {
    const auto left = deadline.Left();
    if (left == std::chrono::nanoseconds::zero()) {
      return false;
    }
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(left);
    const timespec time = {seconds.count(), (left - seconds).count()};
    syscall(SYS_futex, &isSharing, FUTEX_WAIT, 1, &time, nullptr, 0);
  }
  return true;
}

/// Starts a child that becomes another user, who may stop it before it runs its program: it is not
/// waited for without a limit. Otherwise as CloneChild.
pid_t CloneChildOfOther(char* stackEnd, ChildPlan& plan) {
  std::atomic<int> isSharing = 1;
  static_assert(sizeof isSharing == sizeof(int), "the kernel clears an int");
  const pid_t child = clone(RunChild, stackEnd, CLONE_VM | CLONE_CHILD_CLEARTID | SIGCHLD, &plan,
                            nullptr, nullptr, &isSharing);
  if (child < 0 || AwaitOwnMemory(isSharing, kStartLimit)) {
    return child;
  }
  do {
    kill(child, SIGKILL);
  } while (!AwaitOwnMemory(isSharing, kStartLimit));
  plan.error = ETIMEDOUT;
  return child;
}

/// Returns the process id, or -1 with errno set. The parent is suspended until the program runs or
/// the child has ended, which makes sharing its memory safe and the time to start independent of
/// how much memory that is.
pid_t CloneChild(ChildPlan& plan) {
  // Not on the caller's own stack: the child abandons its frames without returning from them, which
  // stack checkers report as corruption.
  const std::unique_ptr<char[]> stack(new (std::nothrow) char[kChildStackSize]);
  if (!stack) {
    errno = ENOMEM;
    return -1;
  }
  char* const stackEnd = stack.get() + kChildStackSize;
  if (FileUser() != geteuid()) {
    return CloneChildOfOther(stackEnd, plan);
  }
  return clone(RunChild, stackEnd, CLONE_VM | CLONE_VFORK | SIGCHLD, &plan);
}

/// Returns 0 when the child has ended, ETIMEDOUT, or another errno value when the system does not
/// support this.
int AwaitByDescriptor(pid_t pid, const Deadline& deadline) {
  const FileDescriptor process(static_cast<int>(syscall(SYS_pidfd_open, pid, 0)));
  if (!process.IsOpen()) {
    return errno;
  }
  return AwaitEvent(process.Get(), POLLIN, deadline);
}

/// Polls, for systems that cannot wait with a limit.
int AwaitByPolling(pid_t pid, const Deadline& deadline) {
  constexpr int kPauseMilliseconds = 10;
  for (;;) {
    siginfo_t info;
    info.si_pid = 0;
    const int result = waitid(P_PID, static_cast<id_t>(pid), &info, WEXITED | WNOWAIT | WNOHANG);
    if (result != 0 && errno != EINTR) {
      return 0;
    }
    if (result == 0 && info.si_pid == pid) {
      return 0;
    }
    if (deadline.Left() == std::chrono::nanoseconds::zero()) {
      return ETIMEDOUT;
    }
    poll(nullptr, 0, kPauseMilliseconds);
  }
}

bool HasEnded(pid_t pid) {
  siginfo_t info;
  info.si_pid = 0;
  const int result = waitid(P_PID, static_cast<id_t>(pid), &info, WEXITED | WNOWAIT | WNOHANG);
  return result != 0 || info.si_pid == pid;
}

int StartPlanned(ChildPlan& plan, pid_t& pid) {
  // A signal handler that ends the children must not run before this one's process id is known.
  const SignalBlock noSignals;
  SetCommandName(plan);
  plan.parent = getpid();
  KeepChildStatus();
  const pid_t child = CloneChild(plan);
  if (child < 0) {
    const int error = errno;
    ReleaseChildStatus();
    return error;
  }
  if (plan.error != 0) {
    ReapChild(child);
    return plan.error;
  }
  pid = child;
  return 0;
}

}  // namespace

int StartChild(const char* program, char* const arguments[], const ChildStreams& streams,
               const Confinement& confinement, pid_t& pid) {
  PreparedConfinement prepared;
  const int error = prepared.Prepare(confinement);
  if (error != 0) {
    return error;
  }
  const std::vector<char*> environment = MakeEnvironment(confinement);
  ChildPlan plan = {program, arguments, &streams, &prepared, environment.data(), 0, {}, 0};
  return StartPlanned(plan, pid);
}

int StartAttachedChild(const char* program, char* const arguments[], pid_t& pid) {
  ChildPlan plan = {program, arguments, nullptr, nullptr, environ, 0, {}, 0};
  return StartPlanned(plan, pid);
}

void AwaitChild(pid_t pid) {
  siginfo_t info;
  while (waitid(P_PID, static_cast<id_t>(pid), &info, WEXITED | WNOWAIT) != 0) {
    if (errno != EINTR) {
      return;
    }
  }
}

bool AwaitChildFor(pid_t pid, std::chrono::seconds limit) {
  const Deadline deadline(limit);
  const int error = AwaitByDescriptor(pid, deadline);
  if (error == 0 || error == ETIMEDOUT) {
    return error == 0;
  }
  return AwaitByPolling(pid, deadline) == 0;
}

void KillOverdueChild(pid_t pid, const char* program, std::chrono::seconds limit) {
  if (!HasEnded(pid)) {
    kill(pid, SIGKILL);
    LogError(std::string(program) + " has not ended within " + std::to_string(limit.count()) +
             " seconds (tool_timeout) and was killed");
  }
  kill(-pid, SIGKILL);
}

void KillGroup(pid_t pid) {
  kill(-pid, SIGKILL);
}

int ReapChild(pid_t pid) {
  int status = -1;
  pid_t reaped;
  do {
    reaped = waitpid(pid, &status, 0);
  } while (reaped < 0 && errno == EINTR);
  ReleaseChildStatus();
  return reaped == pid ? status : -1;
}

std::optional<int> ReapEndedChild(pid_t pid) {
  return HasEnded(pid) ? std::optional<int>(ReapChild(pid)) : std::nullopt;
}

void ReapInheritedChildren(const std::function<bool(pid_t)>& isOwn) {
  for (;;) {
    siginfo_t info;
    info.si_pid = 0;
    if (waitid(P_ALL, 0, &info, WEXITED | WNOHANG | WNOWAIT) != 0 || info.si_pid == 0 ||
        isOwn(info.si_pid)) {
      return;
    }
    waitpid(info.si_pid, nullptr, WNOHANG);
  }
}

void TerminateChild(pid_t pid) {
  kill(pid, SIGTERM);
}

void KillChild(pid_t pid) {
  if (!HasEnded(pid)) {
    kill(pid, SIGKILL);
  }
}

bool HasSucceeded(int waitStatus) {
  return WIFEXITED(waitStatus) && WEXITSTATUS(waitStatus) == 0;
}

}  // namespace vela
