// The photo queue's entries that are being worked off, safe against a crash at any moment.
#pragma once

#include <sys/types.h>

#include <ctime>
#include <string>
#include <unordered_set>
#include <vector>

namespace vela {

/// Where the queue is and what is kept beside it.
struct QueuePaths {
  std::string queue;    ///< new entries are appended to it
  std::string taken;    ///< what it was called when it was taken
  std::string journal;  ///< entries of `taken` that are done, one a line
  std::string later;    ///< entries that could not be worked on, for a later run
};

/// The paths of the photo queue.
QueuePaths PhotoQueuePaths();

/// The entries that were taken from the queue, and which of them are done.
class TakenQueue {
 public:
  explicit TakenQueue(QueuePaths paths) : paths_(std::move(paths)) {}

  /// What a take has found.
  enum class Outcome {
    kNothing,  ///< no entries wait
    kResumed,  ///< entries that an earlier run has left
    kTaken,    ///< new entries
    kBusy,     ///< somebody holds the queue; to be asked again
    kFailed,   ///< told in the log
  };

  /// Takes the entries that an earlier run has left, else those that wait in the queue.
  Outcome Take();

  /// The entries that are not done, each once, in the order of their first appearance.
  const std::vector<std::string>& Entries() const { return entries_; }

  /// Notes that the entry is done: a later run does not repeat it. Returns 0 or an errno value.
  int MarkDone(const std::string& entry);

  /// Keeps an entry for a later run, which is then done for this one. Returns 0 or an errno value.
  int Leave(const std::string& entry);

  /// Puts the entries that were left for later back into the queue. Returns 0 or an errno value,
  /// EWOULDBLOCK while somebody holds the queue.
  int PutBackLeft();

  /// Forgets the taken entries, all of which are done; were any appended since they were read, the
  /// next take goes on with those. Returns 0 or an errno value, EWOULDBLOCK while somebody holds
  /// the file.
  int Finish();

 private:
  int MoveQueue();
  int LeaveEmptyQueue(time_t made) const;
  bool ReadEntries();
  std::unordered_set<std::string> ReadJournal();

  const QueuePaths paths_;
  std::vector<std::string> entries_;
  off_t readSize_ = 0;
};

}  // namespace vela
