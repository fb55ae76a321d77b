// Carries out requests that write to the index.
#pragma once

#include <chrono>
#include <list>

#include "index_store.h"
#include "worker_pool.h"

namespace vela {

/// Writes to the index for many clients, in few transactions. For one thread.
class IndexWriter {
 public:
  using Clock = std::chrono::steady_clock;

  /// A request waits for other writers until it is `patience` old.
  IndexWriter(IndexStore& index, Clock::duration patience) : index_(index), patience_(patience) {}

  /// Carries the jobs out, which are in the order of their arrival, in one transaction as soon as
  /// the index is free. Those for which that is too late fail when their time is over.
  void CarryOut(std::list<Job>& jobs) const;

 private:
  using Position = std::list<Job>::iterator;

  void CarryOutFrom(Position first, std::list<Job>& jobs) const;
  Position FailOverdue(Position first, Position end) const;
  IndexResult Store(Position first, Position end) const;

  IndexStore& index_;
  const Clock::duration patience_;
};

}  // namespace vela
