// The entries of the photo queue that are being processed, recorded so that a crash at any moment
// loses none.
#pragma once

#include <cstdint>
#include <ctime>
#include <string>
#include <unordered_set>
#include <vector>

#include "posix/file_lock.h"

namespace vela {

/// The queue and the files beside it.
struct QueuePaths {
  std::string queue;    ///< new entries are appended to it
  std::string taken;    ///< the queue is renamed to it when it is taken
  std::string journal;  ///< entries of `taken` that are done, one per line
  std::string later;    ///< entries that could not be processed, for a later run
};

/// The paths of the photo queue.
QueuePaths PhotoQueuePaths();

/// The entries that were taken from the queue, and which of them are done.
class TakenQueue {
 public:
  explicit TakenQueue(QueuePaths paths) : paths_(std::move(paths)) {}

  /// What Take has found.
  enum class Outcome {
    kNothing,  ///< no entries
    kResumed,  ///< entries that an earlier run has left
    kTaken,    ///< new entries
    kBusy,     ///< the queue is locked; to be tried again
    kFailed,   ///< the reason is logged
  };

  /// Takes the entries that an earlier run has left, otherwise those in the queue.
  Outcome Take();

  /// Returns the entries that are not done, each once, in the order of their first appearance.
  const std::vector<std::string>& Entries() const { return entries_; }

  /// Records that the entry is done: a later run does not repeat it. Returns 0 or an errno value.
  int MarkDone(const std::string& entry);

  /// Saves an entry for a later run and records it as done for this one. Returns 0 or an errno
  /// value.
  int Defer(const std::string& entry);

  /// Puts the deferred entries back into the queue. Returns 0 or an errno value, EWOULDBLOCK while
  /// the queue is locked.
  int RequeueDeferred();

  /// Removes the taken queue, all of whose entries are done. When entries were appended since it
  /// was read, it stays, and the next Take returns those. Returns 0 or an errno value, EWOULDBLOCK
  /// while the file is locked.
  int Finish();

 private:
  int MoveQueue();
  int RemoveEmptyQueue(time_t modified) const;
  bool ReadEntries();
  std::unordered_set<std::string> ReadJournal();

  const QueuePaths paths_;
  std::vector<std::string> entries_;
  uintmax_t readSize_ = 0;
  LockPatience queuePatience_;
  LockPatience takenPatience_;
};

}  // namespace vela
