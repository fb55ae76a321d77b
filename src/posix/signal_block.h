// Blocking signals temporarily.
#pragma once

#include <signal.h>

#include <initializer_list>

namespace vela {

/// Blocks all signals, or these, for the calling thread until it is destroyed.
class SignalBlock {
 public:
  SignalBlock() {
    sigset_t all;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, &old_);
  }
  explicit SignalBlock(std::initializer_list<int> signals) {
    sigset_t some;
    sigemptyset(&some);
    for (const int signal : signals) {
      sigaddset(&some, signal);
    }
    pthread_sigmask(SIG_BLOCK, &some, &old_);
  }
  ~SignalBlock() { pthread_sigmask(SIG_SETMASK, &old_, nullptr); }
  SignalBlock(const SignalBlock&) = delete;
  SignalBlock& operator=(const SignalBlock&) = delete;

 private:
  sigset_t old_;
};

}  // namespace vela
