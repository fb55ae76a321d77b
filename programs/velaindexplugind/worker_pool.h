// Threads for work that may have to wait for a disk.
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
#include "posix/file_descriptor.h"
#include "request.h"
#include "settings.h"

namespace vela {

/// One request on its way through a pool.
struct Job {
  uint64_t client = 0;  ///< who asked
  Request request;
  Settings settings;
  Answer answer;
  std::chrono::steady_clock::time_point arrival;  ///< when the request was there
};

/// Jobs that are done, handed back to the thread that gave them out. Nothing here takes memory, so
/// that no job can get lost for the want of it.
class DoneJobs {
 public:
  /// Returns 0 or an errno value.
  int Open();

  /// Readable when there are jobs to take.
  int Fd() const { return signal_.Get(); }

  /// Adds the jobs of the list.
  void Add(std::list<Job>& jobs);

  /// Takes all jobs that are there.
  std::list<Job> Take();

 private:
  FileDescriptor signal_;
  std::mutex mutex_;
  std::list<Job> jobs_;
};

/// A fixed number of threads that carry jobs out in the order they come in.
class WorkerPool {
 public:
  /// Carries out the jobs of the list, which is not empty.
  using Work = std::function<void(std::list<Job>&)>;

  /// Starts the threads. They inherit the caller's signal mask. A thread gives `work` what waits,
  /// `batch` jobs at most. `work` must not throw. Throws std::system_error when a thread cannot be
  /// started.
  WorkerPool(int threads, size_t batch, Work work, DoneJobs& done);

  /// Lets the jobs in hand come to their end; those that have not been begun are dropped.
  ~WorkerPool();
  WorkerPool(const WorkerPool&) = delete;
  WorkerPool& operator=(const WorkerPool&) = delete;

  /// Adds the one job of the list.
  void Add(std::list<Job>& job);

  /// Removes the job of a client. Returns false when it has been begun, or done.
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
