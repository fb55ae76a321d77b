#include "worker_pool.h"

#include <algorithm>
#include <exception>
#include <iterator>
#include <utility>

namespace vela {

void DoneJobs::Add(std::list<Job>& jobs) {
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    jobs_.splice(jobs_.end(), jobs);
  }
  signal_.Set();
}

std::list<Job> DoneJobs::Take() {
  signal_.Clear();
  std::list<Job> jobs;
  const std::lock_guard<std::mutex> lock(mutex_);
  jobs.swap(jobs_);
  return jobs;
}

WorkerPool::WorkerPool(int threads, size_t batch, Work work, DoneJobs& done)
    : batch_(batch), work_(std::move(work)), done_(done) {
  try {
    for (int i = 0; i < threads; ++i) {
      threads_.emplace_back(&WorkerPool::Run, this);
    }
  } catch (const std::exception&) {
    Stop();
    throw;
  }
}

WorkerPool::~WorkerPool() {
  Stop();
}

void WorkerPool::Stop() {
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    isStopping_ = true;
  }
  change_.notify_all();
  for (std::thread& thread : threads_) {
    thread.join();
  }
  threads_.clear();
}

void WorkerPool::Add(std::list<Job>& job) {
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    waiting_.splice(waiting_.end(), job);
  }
  change_.notify_one();
}

bool WorkerPool::Remove(uint64_t client) {
  std::list<Job> removed;
  const std::lock_guard<std::mutex> lock(mutex_);
  const auto found = std::find_if(waiting_.begin(), waiting_.end(),
                                  [client](const Job& job) { return job.client == client; });
  if (found == waiting_.end()) {
    return false;
  }
  removed.splice(removed.end(), waiting_, found);
  return true;
}

std::list<Job> WorkerPool::TakeWaiting() {
  std::list<Job> jobs;
  const auto count = static_cast<std::ptrdiff_t>(std::min(batch_, waiting_.size()));
  jobs.splice(jobs.end(), waiting_, waiting_.begin(), std::next(waiting_.begin(), count));
  return jobs;
}

void WorkerPool::Run() {
  std::unique_lock<std::mutex> lock(mutex_);
  for (;;) {
    change_.wait(lock, [this] { return isStopping_ || !waiting_.empty(); });
    if (isStopping_) {
      return;
    }
    std::list<Job> jobs = TakeWaiting();
    lock.unlock();
    work_(jobs);
    done_.Add(jobs);
    lock.lock();
  }
}

}  // namespace vela
