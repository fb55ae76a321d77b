#include "taken_queue.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <system_error>

#include "file_place.h"
#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/file_descriptor.h"
#include "run_log.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

constexpr int kOpenFlags = O_CLOEXEC | O_NOCTTY;

bool IsThere(const std::string& path) {
  struct stat status = {};
  return stat(path.c_str(), &status) == 0;
}

int RemoveFile(const std::string& path) {
  return unlink(path.c_str()) == 0 || errno == ENOENT ? 0 : errno;
}

/// Takes the lock under which entries are appended, without waiting: who holds it may be stopped.
/// Returns 0 or an errno value.
int Lock(int descriptor) {
  return flock(descriptor, LOCK_EX | LOCK_NB) == 0 ? 0 : errno;
}

/// Returns the path without what changes nothing in it. What ".." means depends on links.
std::string WithoutIdleParts(const std::string& path) {
  std::string whole;
  for (size_t begin = 0; begin < path.size();) {
    const size_t end = std::min(path.find('/', begin), path.size());
    const std::string part = path.substr(begin, end - begin);
    if (!part.empty() && part != ".") {
      whole += (whole.empty() && path.front() != '/' ? "" : "/") + part;
    }
    begin = end + 1;
  }
  return whole.empty() ? path.substr(0, 1) : whole;
}

bool IsHeld(const std::string& path) {
  const FileDescriptor file(open(path.c_str(), O_RDONLY | O_NONBLOCK | kOpenFlags));
  return file.IsOpen() && Lock(file.Get()) == EWOULDBLOCK;
}

/// Returns what an entry is known by: the same for spellings of its path.
std::string KeyOf(const std::string& entry) {
  const size_t begin = IsTreeEntry(entry) ? std::strlen(kTreePrefix) : 0;
  return entry.substr(0, begin) + WithoutIdleParts(entry.substr(begin));
}

int AppendLine(const std::string& path, const std::string& text) {
  const FileDescriptor file(open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | kOpenFlags, 0644));
  if (!file.IsOpen()) {
    return errno;
  }
  const off_t end = lseek(file.Get(), 0, SEEK_END);
  const std::string line = text + '\n';
  const ssize_t written = write(file.Get(), line.data(), line.size());
  if (written < 0) {
    return errno;
  }
  if (written == static_cast<ssize_t>(line.size())) {
    return 0;
  }
  return ftruncate(file.Get(), end) == 0 ? ENOSPC : errno;
}

}  // namespace

QueuePaths PhotoQueuePaths() {
  return {kPhotoQueue.file, kPhotoQueue.tempFile, std::string(kPhotoQueue.file) + ".done",
          std::string(kPhotoQueue.file) + ".later"};
}

int TakenQueue::LeaveEmptyQueue(time_t made) const {
  // Whoever has just made it waits for the lock. Taken from under his hands it would be made and
  // taken again and again. He may have been killed, though.
  constexpr time_t kPatience = 10;
  const time_t age = time(nullptr) - made;
  if (age >= 0 && age <= kPatience) {
    return ENOENT;
  }
  const int error = RemoveFile(paths_.queue);
  return error != 0 ? error : ENOENT;
}

int TakenQueue::MoveQueue() {
  const FileDescriptor queue(open(paths_.queue.c_str(), O_RDONLY | O_NONBLOCK | kOpenFlags));
  if (!queue.IsOpen()) {
    return errno;
  }
  struct stat status = {};
  if (fstat(queue.Get(), &status) != 0 || !S_ISREG(status.st_mode)) {
    return EINVAL;
  }
  // Whoever appends holds this lock and looks, once it has it, whether the file is still the queue:
  // after the renaming no entry is written into it any more.
  const int error = Lock(queue.Get());
  if (error != 0) {
    return error;
  }
  if (!IsAtPath(queue.Get(), paths_.queue)) {
    return ENOENT;
  }
  if (fstat(queue.Get(), &status) == 0 && status.st_size == 0) {
    return LeaveEmptyQueue(status.st_mtime);
  }
  return rename(paths_.queue.c_str(), paths_.taken.c_str()) == 0 ? 0 : errno;
}

std::unordered_set<std::string> TakenQueue::ReadJournal() {
  std::unordered_set<std::string> done;
  std::ifstream journal(paths_.journal, std::ios::binary);
  uintmax_t whole = 0;
  for (std::string line; std::getline(journal, line) && !journal.eof();) {
    whole += line.size() + 1;
    done.insert(KeyOf(line));
  }
  // A last line without a newline was cut off when it was written. Left there, it would make
  // another entry of the one that is noted next.
  std::error_code error;
  if (std::filesystem::file_size(paths_.journal, error) > whole && !error) {
    std::filesystem::resize_file(paths_.journal, whole, error);
  }
  return done;
}

bool TakenQueue::ReadEntries() {
  entries_.clear();
  std::unordered_set<std::string> known = ReadJournal();
  struct stat status = {};
  readSize_ = stat(paths_.taken.c_str(), &status) == 0 ? status.st_size : 0;
  const QueueRead read = ForEachQueueEntry(paths_.taken.c_str(), [&](const std::string& entry) {
    if (!entry.empty() && known.insert(KeyOf(entry)).second) {
      entries_.push_back(entry);
    }
  });
  return read == QueueRead::kWhole;
}

TakenQueue::Outcome TakenQueue::Take() {
  const bool isResumed = IsThere(paths_.taken);
  if (!isResumed) {
    // Belongs to entries that are all done and gone.
    int error = RemoveFile(paths_.journal);
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
      WriteLog(LogLevel::kError, "cannot take " + paths_.queue + ": " + ErrnoText(error));
      return Outcome::kFailed;
    }
  }
  if (!ReadEntries()) {
    WriteLog(LogLevel::kError, "cannot read " + paths_.taken + ": " + ErrnoText(errno));
    return Outcome::kFailed;
  }
  return isResumed ? Outcome::kResumed : Outcome::kTaken;
}

int TakenQueue::MarkDone(const std::string& entry) {
  return AppendLine(paths_.journal, entry);
}

int TakenQueue::Leave(const std::string& entry) {
  // In this order: a crash in between makes the entry stand twice, and not be gone.
  const int error = AppendLine(paths_.later, entry);
  return error != 0 ? error : MarkDone(entry);
}

int TakenQueue::PutBackLeft() {
  // Appending waits for whoever holds the queue.
  if (IsHeld(paths_.queue)) {
    return EWOULDBLOCK;
  }
  int error = 0;
  const QueueRead read = ForEachQueueEntry(paths_.later.c_str(), [&](const std::string& entry) {
    if (!entry.empty() && error == 0 && WriteIndexQueue(entry.c_str(), paths_.queue.c_str()) != 0) {
      error = VLIBCErrGet();
    }
  });
  if (read != QueueRead::kWhole) {
    return errno == ENOENT ? 0 : errno;
  }
  return error != 0 ? error : RemoveFile(paths_.later);
}

int TakenQueue::Finish() {
  const FileDescriptor taken(open(paths_.taken.c_str(), O_RDONLY | kOpenFlags));
  if (taken.IsOpen()) {
    const int busy = Lock(taken.Get());
    struct stat status = {};
    if (busy != 0 || fstat(taken.Get(), &status) != 0) {
      return busy != 0 ? busy : errno;
    }
    // Somebody who does not look whether the file is still the queue may have appended to it.
    if (status.st_size != readSize_) {
      return 0;
    }
  }
  entries_.clear();
  const int error = RemoveFile(paths_.taken);
  return error != 0 ? error : RemoveFile(paths_.journal);
}

}  // namespace vela
