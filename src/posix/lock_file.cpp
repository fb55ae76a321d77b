#include "posix/lock_file.h"

#include <fcntl.h>

#include <cerrno>

#include "posix/file_lock.h"

namespace vela {

int LockFile(const std::string& path, FileDescriptor& lock) {
  const int flags = O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW;
  lock = FileDescriptor(open(path.c_str(), flags, 0600));
  if (!lock.IsOpen()) {
    return errno;
  }
  return TryLockExclusively(lock.Get());
}

}  // namespace vela
