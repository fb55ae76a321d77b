// The photo queue's entries that are being worked off, safe against a crash at any moment.
#pragma once

#include <ctime>
#include <string>
#include <unordered_set>
#include <vector>

/// Where the queue is and what is kept beside it.
struct QueuePaths {
  std::string queue;    ///< new entries are appended to it
  std::string taken;    ///< what it was called when it was taken
  std::string journal;  ///< entries of `taken` that are done, one a line
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
    kFailed,   ///< told in the log
  };

  /// Takes the entries that an earlier run has left, else those that wait in the queue.
  Outcome Take();

  /// The entries that are not done, each once, in the order of their first appearance.
  const std::vector<std::string>& Entries() const { return entries_; }

  /// Notes that the entry is done: a later run does not repeat it. Returns 0 or an errno value.
  int MarkDone(const std::string& entry);

  /// Forgets the taken entries, all of which are done. Returns 0 or an errno value.
  int Finish();

 private:
  int MoveQueue();
  int LeaveEmptyQueue(time_t made) const;
  bool ReadEntries();
  std::unordered_set<std::string> ReadJournal();

  const QueuePaths paths_;
  std::vector<std::string> entries_;
};
