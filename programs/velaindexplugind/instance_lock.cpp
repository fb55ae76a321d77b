#include "instance_lock.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>
#include <cstring>

#include "index_directory.h"

std::string LockInstance(const std::string& database, Descriptor& lock) {
  const std::string file = database + ".lock";
  const int flags = O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW;
  MakeDirectoryOf(database);
  lock = Descriptor(open(file.c_str(), flags, 0600));
  if (!lock.IsOpen()) return file + ": " + std::strerror(errno);
  if (flock(lock.Get(), LOCK_EX | LOCK_NB) == 0) return {};
  if (errno == EWOULDBLOCK) return "another instance uses " + database;
  return file + ": " + std::strerror(errno);
}
