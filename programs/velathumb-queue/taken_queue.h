// The entries of the photo queue that are being processed, recorded so that a crash at any moment
// loses none.
#pragma once

#include <cstdint>
#include <ctime>
#include <optional>
#include <string>
#include <unordered_set>
#include <vector>

#include "posix/file_lock.h"
#include "posix/files.h"

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
    kBusy,     ///< the queue is locked, or new and still empty; to be tried again
    kFailed,   ///< the reason is logged
  };

  /// Takes the entries that an earlier run has left, otherwise those in the queue.
  Outcome Take();

  /// Returns the entries that are not done, each once, in the order of their first appearance.
  const std::vector<std::string>& Entries() const { return entries_; }

  /// Returns whether entries were added to the queue since it was taken.
  bool HasNewEntries() const;

  /// Records that the entry is done: a later run does not repeat it. What velathumb has added to
  /// the queue is on the disk before. Returns 0 or an errno value; after a failure nothing more is
  /// recorded until the next Take.
  int MarkDone(const std::string& entry);

  /// Saves entries for a later run and records them as done for this one. Returns 0 or an errno
  /// value.
  int Defer(const std::vector<std::string>& entries);

  /// Adds entries to the end of the queue. When this returns 0 they are on the disk; otherwise it
  /// returns an errno value, EWOULDBLOCK while the queue is locked.
  int AddToQueue(const std::vector<std::string>& entries);

  /// Puts the deferred entries back into the queue. Returns 0 or an errno value, EWOULDBLOCK while
  /// the queue is locked.
  int RequeueDeferred();

  /// Removes the taken queue, all of whose entries are done, once everything that was recorded is
  /// on the disk. When entries were appended since it was read, it stays, and the next Take returns
  /// those. Returns 0 or an errno value, EWOULDBLOCK while the file is locked.
  int Finish();

  /// Returns the errno value of the last of the calls above that failed.
  int LastError() const { return lastError_; }

 private:
  int FindTaken(bool& isFound) const;
  int RemoveOldJournal() const;
  int MoveQueue();
  int RemoveEmptyQueue(time_t modified) const;
  int ReadEntries();
  int ReadJournal(std::unordered_set<std::string>& done) const;
  int RecordDone(const std::string& entry);
  int SyncQueue();
  int SyncRecords() const;
  int CopyDeferred();
  int RemoveTaken();
  int Remember(int error);

  const QueuePaths paths_;
  std::vector<std::string> entries_;
  uintmax_t readSize_ = 0;
  LockPatience queuePatience_;
  LockPatience takenPatience_;
  std::optional<FileStatus> syncedQueue_;  // state of the queue when it was last synchronized
  int recordError_ = 0;                    // of the first entry that could not be recorded
  int lastError_ = 0;
};

}  // namespace vela
