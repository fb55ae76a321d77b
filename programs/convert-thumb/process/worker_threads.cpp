#include "process/worker_threads.h"

#include <sched.h>

#include <atomic>
#include <exception>
#include <new>
#include <system_error>
#include <thread>

#include "process/failure_report.h"

namespace vela {

namespace {

class Work {
 public:
  Work(size_t count, const std::function<bool(size_t)>& work) : count_(count), work_(work) {}

  bool Run() {
    std::thread second = StartSecondThread();
    ProcessAll();
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
      return std::thread([this] { ProcessAll(); });
    } catch (const std::system_error&) {
      // The calling thread then does all of the work.
      return std::thread();
    }
  }

  void ProcessAll() noexcept {
    for (size_t i = next_++; i < count_ && !failed_; i = next_++) {
      if (!Process(i)) {
        failed_ = true;
      }
    }
  }

  bool Process(size_t number) {
    try {
      return work_(number);
    } catch (const std::bad_alloc&) {
      ReportFailure("out of memory");
      return false;
    } catch (const std::exception& error) {
      ReportFailure("%s", error.what());
      return false;
    }
  }

  size_t count_;
  const std::function<bool(size_t)>& work_;
  std::atomic<size_t> next_{0};
  std::atomic<bool> failed_{false};
};

}  // namespace

size_t ProcessorCount() {
  cpu_set_t processors;
  CPU_ZERO(&processors);
  // Fails on machines with more processors than the set can hold.
  return sched_getaffinity(0, sizeof processors, &processors) == 0
             ? static_cast<size_t>(CPU_COUNT(&processors))
             : size_t{CPU_SETSIZE};
}

bool HasSecondProcessor() {
  return ProcessorCount() > 1;
}

bool DoInTwoThreads(size_t count, const std::function<bool(size_t)>& work) {
  return Work(count, work).Run();
}

}  // namespace vela
