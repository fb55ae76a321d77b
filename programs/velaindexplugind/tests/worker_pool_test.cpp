// The worker threads and their queue.
#include "worker_pool.h"

#include <gtest/gtest.h>
#include <poll.h>

#include <future>
#include <list>
#include <utility>
#include <vector>

using namespace vela;

namespace vela_test {
namespace {

using Sizes = std::vector<size_t>;

/// A pool of one thread whose first batch ends after Continue.
class HeldPool {
 public:
  explicit HeldPool(size_t batch)
      : pool_(
            1, batch,
            [this](std::list<Job>& jobs) {
              sizes_.push_back(jobs.size());
              if (sizes_.size() > 1) return;
              begun_.set_value();
              continue_.get_future().wait();
            },
            OpenJobs(done_)) {
    Add(0);
    begun_.get_future().wait();
  }

  void Add(uint64_t client) {
    std::list<Job> job(1);
    job.front().client = client;
    pool_.Add(job);
  }

  bool Remove(uint64_t client) { return pool_.Remove(client); }

  /// Lets the work continue. Returns the clients of the finished jobs as soon as there are `count`.
  std::vector<uint64_t> Continue(size_t count) {
    continue_.set_value();
    std::vector<uint64_t> clients;
    pollfd waiting = {done_.Fd(), POLLIN, 0};
    while (clients.size() < count && poll(&waiting, 1, 60000) == 1) {
      for (const Job& job : done_.Take()) clients.push_back(job.client);
    }
    return clients;
  }

  /// The number of jobs in each batch; after Continue.
  const Sizes& WorkSizes() const { return sizes_; }

 private:
  static DoneJobs& OpenJobs(DoneJobs& done) {
    EXPECT_EQ(done.Open(), 0);
    return done;
  }

  DoneJobs done_;
  std::promise<void> begun_;
  std::promise<void> continue_;
  Sizes sizes_;
  WorkerPool pool_;
};

TEST(WorkerPoolTest, RemovesOnlyPendingJobs) {
  HeldPool pool(1);
  for (const uint64_t client : {1U, 2U, 3U}) pool.Add(client);
  EXPECT_FALSE(pool.Remove(0)) << "it is in progress";
  EXPECT_TRUE(pool.Remove(2));
  EXPECT_FALSE(pool.Remove(2));
  EXPECT_EQ(pool.Continue(3), (std::vector<uint64_t>{0, 1, 3}));
}

TEST(WorkerPoolTest, HandsOutPendingJobsInBatches) {
  HeldPool pool(4);
  for (const uint64_t client : {1U, 2U, 3U, 4U, 5U, 6U}) pool.Add(client);
  EXPECT_EQ(pool.Continue(7), (std::vector<uint64_t>{0, 1, 2, 3, 4, 5, 6}));
  EXPECT_EQ(pool.WorkSizes(), (Sizes{1, 4, 2}));
}

}  // namespace
}  // namespace vela_test
