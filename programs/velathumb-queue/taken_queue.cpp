#include "taken_queue.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdint>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <system_error>

#include "run_log.h"
#include "storage/creation_queue.h"
#include "thumb/descriptor.h"

namespace {

constexpr int kOpenFlags = O_CLOEXEC | O_NOCTTY;

bool IsThere(const std::string& path) {
  struct stat status = {};
  return stat(path.c_str(), &status) == 0;
}

int RemoveFile(const std::string& path) {
  return unlink(path.c_str()) == 0 || errno == ENOENT ? 0 : errno;
}

/// Waits for the lock under which entries are appended. Returns 0 or an errno value.
int Lock(int descriptor) {
  while (flock(descriptor, LOCK_EX) != 0) {
    if (errno != EINTR) {
      return errno;
    }
  }
  return 0;
}

bool IsAtPath(int descriptor, const std::string& path) {
  struct stat open = {};
  struct stat named = {};
  return fstat(descriptor, &open) == 0 && stat(path.c_str(), &named) == 0 &&
         open.st_dev == named.st_dev && open.st_ino == named.st_ino;
}

}  // namespace

QueuePaths PhotoQueuePaths() {
  return {kPhotoQueue.file, kPhotoQueue.tempFile, std::string(kPhotoQueue.file) + ".done"};
}

int TakenQueue::LeaveEmptyQueue(time_t made) const {
  // Whoever has just made it waits for the lock. Taken from under his hands it would be made and
  // taken again and again. He may have been killed, though.
  constexpr time_t kPatience = 10;
  if (time(nullptr) - made <= kPatience) {
    return ENOENT;
  }
  const int error = RemoveFile(paths_.queue);
  return error != 0 ? error : ENOENT;
}

int TakenQueue::MoveQueue() {
  const Descriptor queue(open(paths_.queue.c_str(), O_RDONLY | kOpenFlags));
  if (!queue.IsOpen()) {
    return errno;
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
  struct stat status = {};
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
    done.insert(line);
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
  const QueueRead read = ForEachQueueEntry(paths_.taken.c_str(), [&](const std::string& entry) {
    if (!entry.empty() && known.insert(entry).second) {
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
  const Descriptor journal(
      open(paths_.journal.c_str(), O_WRONLY | O_CREAT | O_APPEND | kOpenFlags, 0644));
  if (!journal.IsOpen()) {
    return errno;
  }
  const off_t end = lseek(journal.Get(), 0, SEEK_END);
  const std::string line = entry + '\n';
  const ssize_t written = write(journal.Get(), line.data(), line.size());
  if (written < 0) {
    return errno;
  }
  if (written == static_cast<ssize_t>(line.size())) {
    return 0;
  }
  return ftruncate(journal.Get(), end) == 0 ? ENOSPC : errno;
}

int TakenQueue::Finish() {
  entries_.clear();
  const int error = RemoveFile(paths_.taken);
  return error != 0 ? error : RemoveFile(paths_.journal);
}
