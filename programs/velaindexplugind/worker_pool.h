// Threads for work that may wait for a disk.
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <list>
#include <mutex>
#include <thread>
#include <vector>

#include "answer.h"
#include "posix/wake_up_signal.h"
#include "request.h"
#include "settings.h"

namespace vela {

/// One request in a pool.
struct Job {
  uint64_t client = 0;  ///< that sent the request
  Request request;
  Settings settings;
  Answer answer;
  std::chrono::steady_clock::time_point arrival;  ///< when the request was complete
};

/// Finished jobs, returned to the thread that submitted them. Nothing here allocates memory, so
/// that no job is lost when out of memory.
class DoneJobs {
 public:
  /// Returns 0 or an errno value.
  int Open() { return signal_.Open(); }

  /// Readable when there are finished jobs.
  int Fd() const { return signal_.Fd(); }

  /// Takes the jobs of the list.
  void Add(std::list<Job>& jobs);

  /// Removes and returns all finished jobs.
  std::list<Job> Take();

 private:
  WakeUpSignal signal_;
  std::mutex mutex_;
  std::list<Job> jobs_;
};

/// A fixed number of threads that carry out jobs in the order of their arrival.
class WorkerPool {
 public:
  /// Carries out the jobs of the list, which is not empty.
  using Work = std::function<void(std::list<Job>&)>;

  /// Starts the threads, which inherit the caller's signal mask. They call `work` with the waiting
  /// jobs, at most `batch` at a time. `work` must not throw. Throws std::system_error when a thread
  /// cannot be started.
  WorkerPool(int threads, size_t batch, Work work, DoneJobs& done);

  /// Waits for the jobs in progress; those that have not been started are dropped.
  ~WorkerPool();
  WorkerPool(const WorkerPool&) = delete;
  WorkerPool& operator=(const WorkerPool&) = delete;

  /// Takes the only job of the list.
  void Add(std::list<Job>& job);

  /// Removes the job of a client. Returns false when it has been started or finished.
  bool Remove(uint64_t client);

 private:
  void Run();
  std::list<Job> TakeWaiting();
  void Stop();

  const size_t batch_;
  const Work work_;
  DoneJobs& done_;
  std::mutex mutex_;
  std::condition_variable change_;
  std::list<Job> waiting_;
  bool isStopping_ = false;
  std::vector<std::thread> threads_;
};

}  // namespace vela
