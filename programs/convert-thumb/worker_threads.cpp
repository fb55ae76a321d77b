#include "worker_threads.h"

#include <sched.h>

#include <atomic>
#include <exception>
#include <new>
#include <system_error>
#include <thread>

#include "failure_line.h"

namespace vela {

namespace {

class Work {
 public:
  Work(size_t count, const std::function<bool(size_t)>& work) : count_(count), work_(work) {}

  bool Run() {
    std::thread second = StartSecondThread();
    TakeAll();
    if (second.joinable()) {
      second.join();
    }
    return !failed_;
  }

 private:
  std::thread StartSecondThread() {
    if (count_ < 2 || !HasSecondProcessor()) {
      return std::thread();
    }
    try {
      return std::thread([this] { TakeAll(); });
    } catch (const std::system_error&) {
      // One thread does all the work as well.
      return std::thread();
    }
  }

  void TakeAll() noexcept {
    for (size_t i = next_++; i < count_ && !failed_; i = next_++) {
      if (!Do(i)) {
        failed_ = true;
      }
    }
  }

  bool Do(size_t number) {
    try {
      return work_(number);
    } catch (const std::bad_alloc&) {
      TellFailure("out of memory");
      return false;
    } catch (const std::exception& error) {
      TellFailure("%s", error.what());
      return false;
    }
  }

  size_t count_;
  const std::function<bool(size_t)>& work_;
  std::atomic<size_t> next_{0};
  std::atomic<bool> failed_{false};
};

}  // namespace

bool HasSecondProcessor() {
  cpu_set_t processors;
  CPU_ZERO(&processors);
  // Fails on machines with more processors than the set has room for.
  return sched_getaffinity(0, sizeof processors, &processors) != 0 || CPU_COUNT(&processors) > 1;
}

bool DoInTwoThreads(size_t count, const std::function<bool(size_t)>& work) {
  return Work(count, work).Run();
}

}  // namespace vela
