#include "child_program.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>

#include <cerrno>
#include <csignal>

#include "posix/file_descriptor.h"

namespace vela {

namespace {

/// Runs in the child: only async-signal-safe calls. Returns when the program cannot be started.
void ExecuteChild(const char* const* arguments, pid_t parent) {
  sigset_t none;
  sigemptyset(&none);
  sigprocmask(SIG_SETMASK, &none, nullptr);
  // An orphan would keep its directory locked against the next run.
  if (prctl(PR_SET_PDEATHSIG, SIGTERM) != 0 || getppid() != parent) {
    return;
  }
  execv(arguments[0], const_cast<char* const*>(arguments));
}

/// Waits for what the child writes when it could not be started. Returns 0 when it was.
int ReadStartError(int descriptor) {
  int error = 0;
  ssize_t got = 0;
  do {
    got = read(descriptor, &error, sizeof error);
  } while (got < 0 && errno == EINTR);
  return got == static_cast<ssize_t>(sizeof error) ? error : 0;
}

}  // namespace

pid_t StartChild(const ChildProgram& program, const std::string& entry, int& error) {
  int ends[2] = {-1, -1};
  if (pipe2(ends, O_CLOEXEC) != 0) {
    error = errno;
    return 0;
  }
  const FileDescriptor reader(ends[0]);
  FileDescriptor writer(ends[1]);
  const char* const arguments[] = {program.path.c_str(), program.profileFile.c_str(), entry.c_str(),
                                   nullptr};
  const pid_t parent = getpid();
  const pid_t child = fork();
  if (child == 0) {
    ExecuteChild(arguments, parent);
    const int reason = errno != 0 ? errno : ECHILD;
    [[maybe_unused]] const ssize_t written = write(writer.Get(), &reason, sizeof reason);
    _exit(127);
  }
  if (child < 0) {
    error = errno;
    return 0;
  }
  { const FileDescriptor closed = std::move(writer); }
  error = ReadStartError(reader.Get());
  if (error == 0) {
    return child;
  }
  waitpid(child, nullptr, 0);
  return 0;
}

}  // namespace vela
