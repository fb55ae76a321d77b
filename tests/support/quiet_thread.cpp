#include "support/quiet_thread.h"

#include <pthread.h>
#include <signal.h>

#include <utility>

namespace vela_test {

std::thread StartQuietThread(std::function<void()> body) {
  sigset_t all;
  sigset_t before;
  sigfillset(&all);
  pthread_sigmask(SIG_SETMASK, &all, &before);
  std::thread thread(std::move(body));
  pthread_sigmask(SIG_SETMASK, &before, nullptr);
  return thread;
}

}  // namespace vela_test
