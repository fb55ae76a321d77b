#include "taken_queue.h"

#include <cerrno>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <optional>
#include <system_error>

#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/file_lock.h"
#include "posix/service_log.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

/// Returns the size of the file, 0 when it is missing.
uintmax_t SizeOf(const std::string& path) {
  std::error_code error;
  const uintmax_t size = std::filesystem::file_size(path, error);
  return error ? 0 : size;
}

int ZeroIfMissing(int error) {
  return error == ENOENT ? 0 : error;
}

bool IsSameState(const FileStatus& a, const FileStatus& b) {
  return a.identity == b.identity && a.size == b.size;
}

}  // namespace

QueuePaths PhotoQueuePaths() {
  return {kPhotoQueue.file, kPhotoQueue.tempFile, kDonePhotosFile, kDeferredPhotosFile};
}

int TakenQueue::RemoveEmptyQueue(time_t modified) const {
  // The process that has just created it is waiting for the lock; if the file were removed at once,
  // both could repeat that forever. That process may have been killed, though. Until then it counts
  // as locked: a service that ended would be started again at once, as the file exists.
  constexpr time_t kGracePeriod = 10;  // seconds
  const time_t age = time(nullptr) - modified;
  if (age >= 0 && age <= kGracePeriod) {
    return EWOULDBLOCK;
  }
  const int error = RemoveFileIfPresent(paths_.queue);
  return error != 0 ? error : ENOENT;
}

int TakenQueue::MoveQueue() {
  // A process that appends holds these locks and then checks that the file is still the queue:
  // after the renaming no entry is written to it. The lock on the file itself is given up when
  // others keep it; a program that uses only that one may then append to the taken file, which
  // Finish notices.
  LockedFile queue;
  const int error = LockFileAt(paths_.queue, queuePatience_, queue);
  if (error != 0) {
    return error;
  }
  if (queue.size == 0) {
    return RemoveEmptyQueue(queue.modified);
  }
  return RenameToNewName(paths_.queue, paths_.taken);
}

int TakenQueue::ReadJournal(std::unordered_set<std::string>& done) const {
  std::ifstream journal(paths_.journal, std::ios::binary);
  uintmax_t completeSize = 0;
  for (std::string line; std::getline(journal, line) && !journal.eof();) {
    completeSize += line.size() + 1;
    done.insert(QueueEntryKey(line));
  }
  // A last line without a newline was cut off when it was written, and would be joined with the
  // line that is appended next.
  std::error_code error;
  if (SizeOf(paths_.journal) > completeSize) {
    std::filesystem::resize_file(paths_.journal, completeSize, error);
  }
  return error.value();
}

int TakenQueue::ReadEntries() {
  entries_.clear();
  recordError_ = 0;
  syncedQueue_.reset();
  std::unordered_set<std::string> known;
  const int error = ReadJournal(known);
  if (error != 0) {
    return error;
  }
  readSize_ = SizeOf(paths_.taken);
  const QueueRead read = ForEachQueueEntry(paths_.taken.c_str(), [&](const std::string& entry) {
    if (!entry.empty() && known.insert(QueueEntryKey(entry)).second) {
      entries_.push_back(entry);
    }
  });
  return read == QueueRead::kComplete ? 0 : errno;
}

/// A failure to examine the file must not be taken for its absence: the next queue would replace
/// it.
int TakenQueue::FindTaken(bool& isFound) const {
  isFound = ExamineFile(paths_.taken).has_value();
  return isFound ? 0 : ZeroIfMissing(errno);
}

/// A journal without taken entries is left over from the queue before. It must be gone for good
/// before it could be taken for that of the next queue.
int TakenQueue::RemoveOldJournal() const {
  const int error = RemoveFile(paths_.journal);
  return error == 0 ? SyncDirectoryOf(paths_.journal) : ZeroIfMissing(error);
}

TakenQueue::Outcome TakenQueue::Take() {
  bool isResumed = false;
  int error = FindTaken(isResumed);
  if (error == 0 && !isResumed) {
    error = RemoveOldJournal();
    if (error == 0) {
      error = MoveQueue();
    }
    if (error == ENOENT) {
      return Outcome::kNothing;
    }
    if (error == EWOULDBLOCK) {
      return Outcome::kBusy;
    }
  }
  if (error != 0) {
    WriteLog(LogLevel::kError, "cannot take " + paths_.queue, Remember(error));
    return Outcome::kFailed;
  }
  error = ReadEntries();
  if (error != 0) {
    WriteLog(LogLevel::kError, "cannot read " + paths_.taken, Remember(error));
    return Outcome::kFailed;
  }
  return isResumed ? Outcome::kResumed : Outcome::kTaken;
}

bool TakenQueue::HasNewEntries() const {
  return SizeOf(paths_.queue) > 0;
}

int TakenQueue::Remember(int error) {
  if (error != 0 && error != EWOULDBLOCK) {
    lastError_ = error;
  }
  return error;
}

/// After a power failure, the note that an entry is done must not exist without what velathumb has
/// added to the queue for it.
int TakenQueue::SyncQueue() {
  const std::optional<FileStatus> status = ExamineFile(paths_.queue);
  if (!status) {
    return ZeroIfMissing(errno);
  }
  if (syncedQueue_ && IsSameState(*syncedQueue_, *status)) {
    return 0;
  }
  int error = SyncFile(paths_.queue);
  if (error == 0) {
    error = SyncDirectoryOf(paths_.queue);
  }
  if (error == 0) {
    syncedQueue_ = status;
  }
  return error;
}

int TakenQueue::RecordDone(const std::string& entry) {
  const int error = SyncQueue();
  return error != 0 ? error : AppendLine(paths_.journal, entry);
}

int TakenQueue::MarkDone(const std::string& entry) {
  // A line after one that could not be written completely would be joined with it.
  if (recordError_ == 0) {
    recordError_ = RecordDone(entry);
  }
  return Remember(recordError_);
}

int TakenQueue::Defer(const std::vector<std::string>& entries) {
  // In this order: after a crash in between the entries exist twice instead of not at all.
  int error = AppendDurably(paths_.later, entries);
  for (const std::string& entry : entries) {
    if (error == 0) {
      error = MarkDone(entry);
    }
  }
  return Remember(error);
}

int TakenQueue::AddToQueue(const std::vector<std::string>& entries) {
  // The lock is waited for elsewhere, so that a signal can end the wait.
  LockedFile queue;
  int error = LockFileAt(paths_.queue, queuePatience_, queue);
  if (error == 0) {
    return Remember(AppendDurably(paths_.queue, entries));
  }
  if (error != ENOENT) {
    return Remember(error);
  }
  for (const std::string& entry : entries) {
    if (WriteIndexQueue(entry.c_str(), paths_.queue.c_str()) != 0) {
      return Remember(VLIBCErrGet());
    }
  }
  error = SyncFile(paths_.queue);
  return Remember(error != 0 ? error : SyncDirectoryOf(paths_.queue));
}

/// Puts the deferred entries into the queue, which exists. Their file stays.
int TakenQueue::CopyDeferred() {
  std::vector<std::string> entries;
  const QueueRead read = ForEachQueueEntry(paths_.later.c_str(), [&](const std::string& entry) {
    if (!entry.empty()) {
      entries.push_back(entry);
    }
  });
  if (read != QueueRead::kComplete) {
    return errno;
  }
  return AddToQueue(entries);
}

int TakenQueue::RequeueDeferred() {
  const std::optional<FileStatus> later = ExamineFile(paths_.later);
  if (!later) {
    return Remember(ZeroIfMissing(errno));
  }
  if (!later->isRegular) {
    return Remember(EINVAL);
  }
  // Renaming needs no space on the volume.
  int error = RenameToNewName(paths_.later, paths_.queue);
  if (error != EEXIST) {
    return Remember(error);
  }
  error = CopyDeferred();
  return Remember(error != 0 ? error : RemoveFileIfPresent(paths_.later));
}

/// Returns 0 when everything that was recorded and queued is on the disk.
int TakenQueue::SyncRecords() const {
  for (const std::string& file : {paths_.queue, paths_.later, paths_.journal}) {
    const int error = ZeroIfMissing(SyncFile(file));
    if (error != 0) {
      return error;
    }
  }
  return SyncDirectoryOf(paths_.taken);
}

int TakenQueue::RemoveTaken() {
  if (recordError_ != 0) {
    return recordError_;
  }
  LockedFile taken;
  int error = LockFileAt(paths_.taken, takenPatience_, taken);
  if (error != 0 && error != ENOENT) {
    return error;
  }
  // A program that does not check whether the file is still the queue may have appended to it.
  if (error == 0 && static_cast<uintmax_t>(taken.size) != readSize_) {
    return 0;
  }
  error = SyncRecords();
  if (error != 0) {
    return error;
  }
  entries_.clear();
  error = RemoveFileIfPresent(paths_.taken);
  return error != 0 ? error : RemoveFileIfPresent(paths_.journal);
}

int TakenQueue::Finish() {
  return Remember(RemoveTaken());
}

}  // namespace vela
