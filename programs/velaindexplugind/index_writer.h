// Carries out the requests that write to the index.
#pragma once

#include <chrono>
#include <list>

#include "index_store.h"
#include "worker_pool.h"

namespace vela {

/// Writes to the index for many clients in few transactions. Not thread-safe.
class IndexWriter {
 public:
  using Clock = std::chrono::steady_clock;

  /// A request waits for other writers until it is as old as `timeout`.
  IndexWriter(IndexStore& index, Clock::duration timeout) : index_(index), timeout_(timeout) {}

  /// Carries out the jobs, which are in the order of their arrival, in one transaction as soon as
  /// the index is free. Jobs that have reached the timeout by then fail.
  void CarryOut(std::list<Job>& jobs) const;

 private:
  using Position = std::list<Job>::iterator;

  void CarryOutFrom(Position first, std::list<Job>& jobs) const;
  Position FailOverdue(Position first, Position end) const;
  IndexResult Store(Position first, Position end) const;

  IndexStore& index_;
  const Clock::duration timeout_;
};

}  // namespace vela
