#include "posix/file_lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <utility>

#include "posix/file_version.h"
#include "posix/files.h"

namespace vela {

namespace {

bool LockForProcess(int fd, bool wait) {
  struct flock whole = {};
  whole.l_type = F_WRLCK;
  whole.l_whence = SEEK_SET;
  return fcntl(fd, wait ? F_SETLKW : F_SETLK, &whole) == 0;
}

bool IsAtPath(int fd, const std::string& path) {
  struct stat open = {};
  struct stat named = {};
  return fstat(fd, &open) == 0 && stat(path.c_str(), &named) == 0 && IsSameFile(open, named);
}

}  // namespace

int LockExclusively(int fd) {
  while (flock(fd, LOCK_EX) != 0) {
    if (errno != EINTR) {
      return errno;
    }
  }
  return 0;
}

int TryLockExclusively(int fd) {
  return flock(fd, LOCK_EX | LOCK_NB) == 0 ? 0 : errno;
}

void Unlock(int fd) {
  flock(fd, LOCK_UN);
}

int LockFile(const std::string& path, FileDescriptor& lock) {
  const int flags = O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW;
  lock = FileDescriptor(open(path.c_str(), flags, 0600));
  if (!lock.IsOpen()) {
    return errno;
  }
  return TryLockExclusively(lock.Get());
}

int LockFileAt(const std::string& path, LockedFile& locked) {
  FileDescriptor file = OpenForReading(path);
  struct stat status = {};
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0) {
    return errno;
  }
  if (!S_ISREG(status.st_mode)) {
    return EINVAL;
  }
  if (const int error = TryLockExclusively(file.Get()); error != 0) {
    return error;
  }
  if (!IsAtPath(file.Get(), path)) {
    return ENOENT;
  }
  if (fstat(file.Get(), &status) != 0) {
    return errno;
  }
  locked = {std::move(file), status.st_size, status.st_mtime};
  return 0;
}

bool IsLocked(const std::string& path) {
  const int flags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;
  const FileDescriptor directory(open(path.c_str(), flags));
  return directory.IsOpen() && TryLockExclusively(directory.Get()) == EWOULDBLOCK;
}

FileDescriptor TakeProcessLock(const std::string& path, bool wait) {
  for (;;) {
    FileDescriptor file(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOCTTY, 0644));
    if (!file.IsOpen()) {
      return file;
    }
    if (!LockForProcess(file.Get(), wait)) {
      file.Reset();
      return file;
    }
    if (IsAtPath(file.Get(), path)) {
      return file;
    }
  }
}

}  // namespace vela
