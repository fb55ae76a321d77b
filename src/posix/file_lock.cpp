#include "posix/file_lock.h"

#include <sys/file.h>

#include <cerrno>

namespace vela {

int LockExclusively(int fd) {
  while (flock(fd, LOCK_EX) != 0) {
    if (errno != EINTR) return errno;
  }
  return 0;
}

int TryLockExclusively(int fd) {
  return flock(fd, LOCK_EX | LOCK_NB) == 0 ? 0 : errno;
}

void Unlock(int fd) {
  flock(fd, LOCK_UN);
}

bool IsSameFile(const struct stat& a, const struct stat& b) {
  return a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

}  // namespace vela
