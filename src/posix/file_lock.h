// Locks on files, which may be renamed or removed while others wait for the lock.
#pragma once

#include <cstdint>
#include <ctime>
#include <string>

#include "posix/file_descriptor.h"

namespace vela {

/// Waits for an exclusive lock on the open file `fd`. Returns 0 or an errno value. The lock ends
/// with the descriptor.
int LockExclusively(int fd);

/// Takes an exclusive lock on the open file `fd` without waiting. Returns 0 or an errno value,
/// EWOULDBLOCK while another process holds a lock. The lock ends with the descriptor.
int TryLockExclusively(int fd);

/// Releases the lock on the open file `fd`, also for processes that share the descriptor.
void Unlock(int fd);

/// Locks the file `path` exclusively, without waiting, until `lock` is closed. Creates it when it
/// is missing, for its owner only; never follows a symbolic link. Returns 0, EWOULDBLOCK when
/// another process holds the lock, or another errno value.
int LockFile(const std::string& path, FileDescriptor& lock);

/// A file with an exclusive lock, and its state under the lock.
struct LockedFile {
  FileDescriptor file;  ///< closing it releases the lock
  int64_t size = 0;     ///< bytes
  time_t modified = 0;  ///< time of the last modification
};

/// Opens the regular file `path` for reading and locks it exclusively, without waiting. Returns 0
/// or an errno value: EWOULDBLOCK when another process holds a lock, EINVAL for anything but a
/// regular file, ENOENT also when the file was renamed or removed before it was locked.
int LockFileAt(const std::string& path, LockedFile& locked);

/// Returns true when another process holds a lock of any kind on the directory `path`, so that no
/// exclusive one can be taken; false when it cannot be opened. Never follows a symbolic link at the
/// end of the path, never waits.
bool IsLocked(const std::string& path);

/// Opens the lock file `path`, created with mode 0644 when missing, and takes a lock that no child
/// inherits: it is released when this process ends. With `wait`, waits for the current holder.
/// Returns the open file, or none with errno set: EAGAIN or EACCES when another process has the
/// lock.
FileDescriptor TakeProcessLock(const std::string& path, bool wait);

}  // namespace vela
