#include "posix/file_lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdio>
#include <thread>
#include <utility>

#include "posix/file_version.h"
#include "posix/files.h"
#include "posix/folder.h"

namespace vela {

namespace {

using std::chrono::milliseconds;
using Clock = std::chrono::steady_clock;

/// Guards are held for the time of a small change; only a process that hangs exceeds this.
constexpr milliseconds kGuardLimit = std::chrono::minutes(1);

/// After a wait in vain, files that others keep locked are waited for only briefly during this
/// time, or each of thousands of changes would wait.
constexpr milliseconds kImpatience = std::chrono::minutes(1);
/// Others that respect the lock hold it for a moment only.
constexpr milliseconds kImpatientLimit(50);

/// Only root can write to the directory, and it is not on the volume of the guarded files, which
/// may be full.
constexpr char kGuardPrefix[] = "/var/run/velathumb-lock.";

constexpr int kLockFileFlags = O_RDWR | O_CREAT | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
constexpr mode_t kPrivate = 0600;
constexpr mode_t kBitsOfOthers = 077;

std::string GuardNameOf(const std::string& path) {
  return kGuardPrefix + path.substr(path.rfind('/') + 1);
}

bool LockForProcess(int fd, short type, bool wait) {
  struct flock whole = {};
  whole.l_type = type;
  whole.l_whence = SEEK_SET;
  return fcntl(fd, wait ? F_SETLKW : F_SETLK, &whole) == 0;
}

enum class Links { kFollowed, kNotFollowed };

bool IsAtPath(int fd, const std::string& path, Links links) {
  struct stat open = {};
  struct stat named = {};
  const int flags = links == Links::kFollowed ? 0 : AT_SYMLINK_NOFOLLOW;
  return fstat(fd, &open) == 0 && fstatat(AT_FDCWD, path.c_str(), &named, flags) == 0 &&
         IsSameFile(open, named);
}

bool IsForeign(uid_t owner) {
  return owner != 0 && owner != geteuid();
}

int ErrorOfOpen(const std::string& path) {
  const int error = errno;
  // EWOULDBLOCK: its owner has a lease on the file.
  if (error == EWOULDBLOCK) {
    return EPERM;
  }
  // Some systems refuse to open a file of another user in a directory such as /tmp.
  struct stat named = {};
  if (error == EACCES && lstat(path.c_str(), &named) == 0 && IsForeign(named.st_uid)) {
    return EPERM;
  }
  return error;
}

bool IsPrivate(const struct stat& status) {
  return (status.st_mode & kBitsOfOthers) == 0;
}

/// Opens or creates the lock file. `isPrivate` is false when other users may have opened it.
/// Returns 0 or an errno value, for example when it is not a regular file of this user with one
/// name.
int OpenLockFile(const std::string& path, FileDescriptor& file, bool& isPrivate) {
  file.Reset(open(path.c_str(), kLockFileFlags, kPrivate));
  if (!file.IsOpen()) {
    return ErrorOfOpen(path);
  }
  struct stat status = {};
  if (fstat(file.Get(), &status) != 0) {
    return errno;
  }
  if (!S_ISREG(status.st_mode)) {
    return EINVAL;
  }
  if (status.st_uid != geteuid()) {
    return EPERM;
  }
  if (status.st_nlink > 1) {
    return EMLINK;
  }
  isPrivate = IsPrivate(status);
  return 0;
}

/// Replaces a lock file that other users may have opened by a private one, unless another process
/// does that. Returns 0 or an errno value.
int ReplaceByPrivate(const std::string& path) {
  const std::string replacement = path + ".new";
  FileDescriptor file;
  bool isPrivate = false;
  int error = OpenLockFile(replacement, file, isPrivate);
  if (error == 0) {
    error = isPrivate ? LockExclusively(file.Get(), kGuardLimit) : EPERM;
  }
  if (error != 0 || !IsAtPath(file.Get(), replacement, Links::kNotFollowed)) {
    return error;
  }
  struct stat named = {};
  if (lstat(path.c_str(), &named) == 0 && IsPrivate(named)) {
    return unlink(replacement.c_str()) == 0 ? 0 : errno;
  }
  return std::rename(replacement.c_str(), path.c_str()) == 0 ? 0 : errno;
}

/// Opens the lock file and locks it, once. Sets `isTaken` when that succeeded and the file is still
/// at its path. Returns 0 or an errno value.
int TryProcessLock(const std::string& path, bool wait, FileDescriptor& file, bool& isTaken) {
  bool isPrivate = false;
  if (const int error = OpenLockFile(path, file, isPrivate); error != 0) {
    return error;
  }
  // Whoever can only read the file can hold a read lock, but only its owner a write lock.
  if (!LockForProcess(file.Get(), isPrivate ? F_WRLCK : F_RDLCK, wait)) {
    return errno == EACCES ? EAGAIN : errno;
  }
  if (!IsAtPath(file.Get(), path, Links::kNotFollowed)) {
    return 0;
  }
  isTaken = isPrivate;
  return isPrivate ? 0 : ReplaceByPrivate(path);
}

/// Opens a lock file that no other user can have opened. Returns 0 or an errno value.
int OpenPrivateLockFile(const std::string& path, FileDescriptor& file) {
  for (;;) {
    bool isPrivate = false;
    int error = OpenLockFile(path, file, isPrivate);
    if (error != 0 || isPrivate) {
      return error;
    }
    error = ReplaceByPrivate(path);
    if (error != 0) {
      return error;
    }
  }
}

/// Returns true when the private file cannot be created: this process is not root's, or there is no
/// room for the file or its name.
bool IsGuardImpossible(int error) {
  return error == EACCES || error == EROFS || error == ENOSPC || error == EDQUOT ||
         error == ENOENT || error == ENAMETOOLONG;
}

std::atomic<Clock::rep> impatientUntil{Clock::time_point::min().time_since_epoch().count()};

milliseconds ForeignLockLimit() {
  const auto now = Clock::now().time_since_epoch().count();
  return now < impatientUntil ? kImpatientLimit : kForeignLockLimit;
}

/// Waits while others hold the lock, but not each time.
int LockDespiteOthers(int fd) {
  const int error = LockExclusively(fd, ForeignLockLimit());
  if (error == EWOULDBLOCK) {
    impatientUntil = (Clock::now() + kImpatience).time_since_epoch().count();
  }
  return error;
}

/// Locks the file itself, its guard being taken. Returns as LockFileAt does.
int LockGuarded(const std::string& path, LockPatience& patience, LockedFile& locked) {
  locked.file = OpenForReading(path);
  struct stat status = {};
  if (!locked.file.IsOpen() || fstat(locked.file.Get(), &status) != 0) {
    return errno;
  }
  if (!S_ISREG(status.st_mode)) {
    return EINVAL;
  }
  const int error = TryLockExclusively(locked.file.Get());
  if (error == 0) {
    patience.Renew();
  } else if (error != EWOULDBLOCK || !patience.IsExhausted() || !locked.guard.IsHeld()) {
    return error;
  }
  if (!IsAtPath(locked.file.Get(), path, Links::kFollowed)) {
    return ENOENT;
  }
  if (fstat(locked.file.Get(), &status) != 0) {
    return errno;
  }
  locked.size = status.st_size;
  locked.modified = status.st_mtime;
  return 0;
}

}  // namespace

int LockExclusively(int fd, milliseconds limit) {
  constexpr std::chrono::microseconds kLongestPause(50000);
  std::chrono::microseconds pause(200);
  const auto end = Clock::now() + limit;
  for (;;) {
    const int error = TryLockExclusively(fd);
    if (error != EWOULDBLOCK && error != EINTR) {
      return error;
    }
    const auto left = std::chrono::ceil<std::chrono::microseconds>(end - Clock::now());
    if (left.count() <= 0) {
      return EWOULDBLOCK;
    }
    std::this_thread::sleep_for(std::min(pause, left));
    pause = std::min(pause * 2, kLongestPause);
  }
}

int TryLockExclusively(int fd) {
  return flock(fd, LOCK_EX | LOCK_NB) == 0 ? 0 : errno;
}

void Unlock(int fd) {
  flock(fd, LOCK_UN);
}

int LockFile(const std::string& path, FileDescriptor& lock) {
  lock = FileDescriptor(open(path.c_str(), kLockFileFlags, kPrivate));
  if (!lock.IsOpen()) {
    return ErrorOfOpen(path);
  }
  return TryLockExclusively(lock.Get());
}

int FileGuard::TakeWithin(const std::string& path, milliseconds limit) {
  Release();
  name_ = GuardNameOf(path);
  for (;;) {
    FileDescriptor file;
    int error = OpenPrivateLockFile(name_, file);
    if (IsGuardImpossible(error)) {
      return 0;
    }
    if (error == 0) {
      error = LockExclusively(file.Get(), limit);
    }
    if (error != 0) {
      return error;
    }
    // Otherwise the previous holder has removed it.
    if (IsAtPath(file.Get(), name_, Links::kNotFollowed)) {
      lock_ = std::move(file);
      return 0;
    }
  }
}

int FileGuard::Take(const std::string& path) {
  const int error = TakeWithin(path, kGuardLimit);
  return error == EWOULDBLOCK ? ETIMEDOUT : error;
}

int FileGuard::TryToTake(const std::string& path) {
  return TakeWithin(path, milliseconds(0));
}

int FileGuard::LockToo(int fd) const {
  const int error = LockDespiteOthers(fd);
  return error == EWOULDBLOCK && IsHeld() ? 0 : error;
}

void FileGuard::Release() {
  // An administrator may have removed the file; then the one at the path is another process's.
  if (lock_.IsOpen() && IsAtPath(lock_.Get(), name_, Links::kNotFollowed)) {
    unlink(name_.c_str());
  }
  lock_.Reset();
}

bool LockPatience::IsExhausted() {
  const auto now = Clock::now();
  if (!since_) {
    since_ = now;
  }
  return now - *since_ >= kForeignLockLimit;
}

int LockFileAt(const std::string& path, LockPatience& patience, LockedFile& locked) {
  struct stat status = {};
  if (stat(path.c_str(), &status) != 0) {
    return errno;
  }
  int error = locked.guard.TryToTake(path);
  if (error == 0) {
    error = LockGuarded(path, patience, locked);
  }
  if (error != 0) {
    locked.file.Reset();
    locked.guard.Release();
  }
  return error;
}

bool IsLocked(const std::string& path) {
  const FileDescriptor directory = FolderEntry(path).Open(O_RDONLY | O_DIRECTORY);
  return directory.IsOpen() && TryLockExclusively(directory.Get()) == EWOULDBLOCK;
}

ProcessLockState StateOfProcessLock(const std::string& path) {
  constexpr int kFlags = O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
  const FileDescriptor file(open(path.c_str(), kFlags));
  if (!file.IsOpen()) {
    return errno == EACCES || errno == EPERM ? ProcessLockState::kUnknown : ProcessLockState::kFree;
  }
  struct flock whole = {};
  whole.l_type = F_WRLCK;
  whole.l_whence = SEEK_SET;
  if (fcntl(file.Get(), F_GETLK, &whole) != 0) {
    return ProcessLockState::kUnknown;
  }
  return whole.l_type == F_UNLCK ? ProcessLockState::kFree : ProcessLockState::kHeld;
}

FileDescriptor TakeProcessLock(const std::string& path, bool wait) {
  FileDescriptor file;
  for (bool isTaken = false; !isTaken;) {
    const int error = TryProcessLock(path, wait, file, isTaken);
    if (error != 0) {
      file.Reset();
      errno = error;
      return file;
    }
  }
  return file;
}

}  // namespace vela
