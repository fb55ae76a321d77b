#include "posix/processes.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

namespace vela {

ProcessState StateOfProcess(long pid) {
  const auto id = static_cast<pid_t>(pid);
  if (id != pid) {
    return ProcessState::kGone;
  }
  if (kill(id, 0) == 0) {
    return ProcessState::kRunning;
  }
  return errno == EPERM ? ProcessState::kInaccessible : ProcessState::kGone;
}

void ReserveStandardDescriptors() {
  int descriptor = 0;
  do {
    descriptor = open("/dev/null", O_RDWR);
  } while (descriptor >= 0 && descriptor <= STDERR_FILENO);
  if (descriptor > STDERR_FILENO) {
    close(descriptor);
  }
}

void CreateFilesWithExactModes() {
  umask(0);
}

uint64_t RaiseOpenFileLimit(uint64_t wanted) {
  rlimit limit{};
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) {
    return wanted;
  }
  if (limit.rlim_cur >= wanted) {
    return limit.rlim_cur;
  }
  limit.rlim_cur = std::min<rlim_t>(wanted, limit.rlim_max);
  setrlimit(RLIMIT_NOFILE, &limit);
  getrlimit(RLIMIT_NOFILE, &limit);
  return limit.rlim_cur;
}

void BlockSignals(std::initializer_list<int> signals) {
  sigset_t blocked;
  sigemptyset(&blocked);
  for (const int number : signals) {
    sigaddset(&blocked, number);
  }
  pthread_sigmask(SIG_BLOCK, &blocked, nullptr);
}

void IgnoreBrokenPipes() {
  signal(SIGPIPE, SIG_IGN);
}

}  // namespace vela
