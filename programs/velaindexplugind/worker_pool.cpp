#include "worker_pool.h"

#include <sys/eventfd.h>

#include <cerrno>
#include <exception>
#include <utility>

int DoneJobs::Open() {
  signal_ = Descriptor(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK));
  return signal_.IsOpen() ? 0 : errno;
}

void DoneJobs::Add(std::list<Job>& job) {
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    jobs_.splice(jobs_.end(), job);
  }
  // Can fail only when the counter is full, and then the other side is sure to wake up.
  eventfd_write(signal_.Get(), 1);
}

std::list<Job> DoneJobs::Take() {
  eventfd_t count = 0;
  eventfd_read(signal_.Get(), &count);
  std::list<Job> jobs;
  const std::lock_guard<std::mutex> lock(mutex_);
  jobs.swap(jobs_);
  return jobs;
}

WorkerPool::WorkerPool(int threads, Work work, DoneJobs& done)
    : work_(std::move(work)), done_(done) {
  try {
    for (int i = 0; i < threads; ++i) threads_.emplace_back(&WorkerPool::Run, this);
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
  for (std::thread& thread : threads_) thread.join();
  threads_.clear();
}

void WorkerPool::Add(std::list<Job>& job) {
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    waiting_.splice(waiting_.end(), job);
  }
  change_.notify_one();
}

void WorkerPool::Run() {
  std::unique_lock<std::mutex> lock(mutex_);
  for (;;) {
    change_.wait(lock, [this] { return isStopping_ || !waiting_.empty(); });
    if (isStopping_) return;
    std::list<Job> job;
    job.splice(job.end(), waiting_, waiting_.begin());
    lock.unlock();
    work_(job.front());
    done_.Add(job);
    lock.lock();
  }
}
