#include "posix/process_setup.h"

#include <signal.h>
#include <sys/resource.h>

#include <algorithm>

namespace vela {

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
