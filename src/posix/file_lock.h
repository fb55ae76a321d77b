// Locks on files, which may be renamed or removed while others wait for the lock.
#pragma once

#include <chrono>
#include <cstdint>
#include <ctime>
#include <optional>
#include <string>

#include "posix/file_descriptor.h"

namespace vela {

/// How long a lock that any user who can read the file can hold is waited for.
constexpr std::chrono::milliseconds kForeignLockLimit(2000);

/// Waits for an exclusive lock on the open file `fd`, at most for `limit`. Returns 0 or an errno
/// value, EWOULDBLOCK when another process still holds a lock. The lock ends with the descriptor.
int LockExclusively(int fd, std::chrono::milliseconds limit);

/// Takes an exclusive lock on the open file `fd` without waiting. Returns 0 or an errno value,
/// EWOULDBLOCK while another process holds a lock. The lock ends with the descriptor.
int TryLockExclusively(int fd);

/// Releases the lock on the open file `fd`, also for processes that share the descriptor.
void Unlock(int fd);

/// Locks the file `path` exclusively, without waiting, until `lock` is closed. Creates it when it
/// is missing, for its owner only; never follows a symbolic link. Returns 0, EWOULDBLOCK when
/// another process holds the lock, or another errno value.
int LockFile(const std::string& path, FileDescriptor& lock);

/// Keeps this program's processes from changing a file at the same time. Any user who can read a
/// file can lock it, and could stop those who wait for that lock. The lock that counts is therefore
/// on a file in a directory that only root can write to, private to its owner; it exists while the
/// lock is held or after a holder was killed. The lock on the file itself keeps out other programs
/// as well, but is not waited for without a limit.
///
/// Only root can make the private file. For other users, and when there is no room for it, the lock
/// on the file itself is the only one, and LockToo fails when it cannot be taken in time.
class FileGuard {
 public:
  FileGuard() = default;
  ~FileGuard() { Release(); }
  FileGuard(const FileGuard&) = delete;
  FileGuard& operator=(const FileGuard&) = delete;

  /// Takes the lock for the file `path`, which need not exist: all files of the same name share
  /// one. Waits for another process of the same user for a minute. Returns 0 or an errno value:
  /// EPERM, EMLINK, EINVAL or ELOOP when the lock's own file is not a regular file of this user
  /// with one name.
  int Take(const std::string& path);

  /// The same without waiting. Returns EWOULDBLOCK while another process holds the lock.
  int TryToTake(const std::string& path);

  /// Locks the open file itself, waiting for at most kForeignLockLimit, and for a while after a
  /// wait in vain not at all. Returns 0 also when it is locked by others but the guard is held.
  /// Otherwise returns an errno value, EWOULDBLOCK when it is locked.
  int LockToo(int fd) const;

  /// Returns false when there was no private file to lock.
  bool IsHeld() const { return lock_.IsOpen(); }

  void Release();

 private:
  int TakeWithin(const std::string& path, std::chrono::milliseconds limit);

  std::string name_;
  FileDescriptor lock_;
};

/// For how long a file has been found locked by others, for callers who try again instead of
/// waiting.
class LockPatience {
 public:
  /// Called when the lock was refused. Returns true when that has gone on for kForeignLockLimit.
  bool IsExhausted();

  /// Called when the lock was taken.
  void Renew() { since_.reset(); }

 private:
  std::optional<std::chrono::steady_clock::time_point> since_;
};

/// A file with an exclusive lock, and its state under the lock.
struct LockedFile {
  FileGuard guard;
  FileDescriptor file;  ///< closing it releases the lock on the file itself
  int64_t size = 0;     ///< bytes
  time_t modified = 0;  ///< time of the last modification
};

/// Opens the regular file `path` for reading and locks it exclusively, without waiting: with its
/// guard, and the file itself unless others have kept it locked for longer than `patience`. Returns
/// 0 or an errno value: EWOULDBLOCK when another process holds a lock, EINVAL for anything but a
/// regular file, ENOENT also when the file was renamed or removed before it was locked.
int LockFileAt(const std::string& path, LockPatience& patience, LockedFile& locked);

/// Returns true when another process holds a lock of any kind on the directory `path`, so that no
/// exclusive one can be taken; false when it cannot be opened. Follows only links that can be
/// trusted (posix/folder.h), never waits.
bool IsLocked(const std::string& path);

/// Opens the lock file `path`, created for its owner only when missing, and takes a lock that no
/// child inherits: it is released when this process ends. With `wait`, waits for the current
/// holder. A file that other users can open, as earlier versions created it, is replaced: their
/// locks do not count. Returns the open file, or none with errno set: EAGAIN when another process
/// of this user has the lock, EACCES or EPERM when this user may not open the file, otherwise also
/// when something other than a regular file of this user is at `path`.
FileDescriptor TakeProcessLock(const std::string& path, bool wait);

/// Whether a process holds the lock of TakeProcessLock.
enum class ProcessLockState {
  kFree,
  kHeld,
  kUnknown,  ///< this user may not open the lock file
};

/// Returns the state of the lock at `path`. Neither creates the file nor takes a lock, so that
/// nobody who takes the lock at that moment is refused.
ProcessLockState StateOfProcessLock(const std::string& path);

}  // namespace vela
