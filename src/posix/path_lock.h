// Locks on the file at a path, which may be renamed or removed meanwhile.
#pragma once

#include <cstdint>
#include <ctime>
#include <string>

#include "posix/file_descriptor.h"

namespace vela {

/// Returns whether the open file `fd` is the one at `path`.
bool IsAtPath(int fd, const std::string& path);

/// A file with an exclusive lock, and its state under the lock.
struct LockedFile {
  FileDescriptor file;  ///< the lock is released with it
  int64_t size = 0;     ///< bytes
  time_t modified = 0;  ///< time of the last modification
};

/// Opens the regular file `path` for reading and locks it exclusively, without waiting. Returns 0
/// or an errno value: EWOULDBLOCK when another process holds a lock, EINVAL for other than a
/// regular file, ENOENT also when the file was renamed or removed before the lock was there.
int LockFileAt(const std::string& path, LockedFile& locked);

/// Returns whether another process holds an exclusive lock on the file or directory `path`; false
/// when that cannot be opened.
bool IsLocked(const std::string& path);

/// Opens the lock file `path`, made with mode 0644 when missing, and takes a lock that no child
/// inherits: it is free as soon as this process ends. With `wait` waits for the present holder.
/// Returns the open file, or none with errno set: EAGAIN or EACCES when another process has the
/// lock.
FileDescriptor TakeProcessLock(const std::string& path, bool wait);

}  // namespace vela
