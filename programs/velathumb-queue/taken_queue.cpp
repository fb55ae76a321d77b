#include "taken_queue.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <system_error>

#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/file_lock.h"
#include "posix/files.h"
#include "posix/service_log.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

/// Returns the path without empty and "." components. ".." components stay: where they lead depends
/// on links.
std::string NormalizePath(const std::string& path) {
  std::string normalized;
  for (size_t begin = 0; begin < path.size();) {
    const size_t end = std::min(path.find('/', begin), path.size());
    const std::string component = path.substr(begin, end - begin);
    if (!component.empty() && component != ".") {
      normalized += (normalized.empty() && path.front() != '/' ? "" : "/") + component;
    }
    begin = end + 1;
  }
  return normalized.empty() ? path.substr(0, 1) : normalized;
}

/// Returns what identifies an entry: the same for all spellings of its path.
std::string KeyOf(const std::string& entry) {
  const size_t begin = IsTreeEntry(entry) ? std::strlen(kTreePrefix) : 0;
  return entry.substr(0, begin) + NormalizePath(entry.substr(begin));
}

/// Returns the size of the file, 0 when it is missing.
uintmax_t SizeOf(const std::string& path) {
  std::error_code error;
  const uintmax_t size = std::filesystem::file_size(path, error);
  return error ? 0 : size;
}

bool Exists(const std::string& path) {
  std::error_code error;
  return std::filesystem::exists(path, error);
}

}  // namespace

QueuePaths PhotoQueuePaths() {
  return {kPhotoQueue.file, kPhotoQueue.tempFile, std::string(kPhotoQueue.file) + ".done",
          std::string(kPhotoQueue.file) + ".later"};
}

int TakenQueue::RemoveEmptyQueue(time_t modified) const {
  // The process that has just created it is waiting for the lock; if the file were removed at once,
  // both could repeat that forever. That process may have been killed, though.
  constexpr time_t kGracePeriod = 10;  // seconds
  const time_t age = time(nullptr) - modified;
  if (age >= 0 && age <= kGracePeriod) {
    return ENOENT;
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
  return std::rename(paths_.queue.c_str(), paths_.taken.c_str()) == 0 ? 0 : errno;
}

std::unordered_set<std::string> TakenQueue::ReadJournal() {
  std::unordered_set<std::string> done;
  std::ifstream journal(paths_.journal, std::ios::binary);
  uintmax_t completeSize = 0;
  for (std::string line; std::getline(journal, line) && !journal.eof();) {
    completeSize += line.size() + 1;
    done.insert(KeyOf(line));
  }
  // A last line without a newline was cut off when it was written, and would be joined with the
  // line that is appended next.
  if (SizeOf(paths_.journal) > completeSize) {
    std::error_code error;
    std::filesystem::resize_file(paths_.journal, completeSize, error);
  }
  return done;
}

bool TakenQueue::ReadEntries() {
  entries_.clear();
  std::unordered_set<std::string> known = ReadJournal();
  readSize_ = SizeOf(paths_.taken);
  const QueueRead read = ForEachQueueEntry(paths_.taken.c_str(), [&](const std::string& entry) {
    if (!entry.empty() && known.insert(KeyOf(entry)).second) {
      entries_.push_back(entry);
    }
  });
  return read == QueueRead::kComplete;
}

TakenQueue::Outcome TakenQueue::Take() {
  const bool isResumed = Exists(paths_.taken);
  if (!isResumed) {
    // A journal without taken entries is left over from the queue before.
    int error = RemoveFileIfPresent(paths_.journal);
    if (error == 0) {
      error = MoveQueue();
    }
    if (error == ENOENT) {
      return Outcome::kNothing;
    }
    if (error == EWOULDBLOCK) {
      return Outcome::kBusy;
    }
    if (error != 0) {
      WriteLog(LogLevel::kError, "cannot take " + paths_.queue, error);
      return Outcome::kFailed;
    }
  }
  if (!ReadEntries()) {
    WriteLog(LogLevel::kError, "cannot read " + paths_.taken, errno);
    return Outcome::kFailed;
  }
  return isResumed ? Outcome::kResumed : Outcome::kTaken;
}

int TakenQueue::MarkDone(const std::string& entry) {
  return AppendLine(paths_.journal, entry);
}

int TakenQueue::Defer(const std::string& entry) {
  // In this order: after a crash in between the entry exists twice instead of not at all.
  const int error = AppendLine(paths_.later, entry);
  return error != 0 ? error : MarkDone(entry);
}

int TakenQueue::RequeueDeferred() {
  // Appending would wait for the lock, whatever its kind.
  if (LockedFile queue; LockFileAt(paths_.queue, queuePatience_, queue) == EWOULDBLOCK) {
    return EWOULDBLOCK;
  }
  int error = 0;
  const QueueRead read = ForEachQueueEntry(paths_.later.c_str(), [&](const std::string& entry) {
    if (!entry.empty() && error == 0 && WriteIndexQueue(entry.c_str(), paths_.queue.c_str()) != 0) {
      error = VLIBCErrGet();
    }
  });
  if (read != QueueRead::kComplete) {
    return errno == ENOENT ? 0 : errno;
  }
  return error != 0 ? error : RemoveFileIfPresent(paths_.later);
}

int TakenQueue::Finish() {
  LockedFile taken;
  int error = LockFileAt(paths_.taken, takenPatience_, taken);
  if (error != 0 && error != ENOENT) {
    return error;
  }
  // A program that does not check whether the file is still the queue may have appended to it.
  if (error == 0 && static_cast<uintmax_t>(taken.size) != readSize_) {
    return 0;
  }
  entries_.clear();
  error = RemoveFileIfPresent(paths_.taken);
  return error != 0 ? error : RemoveFileIfPresent(paths_.journal);
}

}  // namespace vela
