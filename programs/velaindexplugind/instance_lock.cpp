#include "instance_lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace vela {

namespace {

constexpr char kRootsSocketLock[] = "/run/velaindexplugind.lock";

/// `busy` is what went wrong when another process has the lock.
std::string Lock(const std::string& file, const std::string& busy, FileDescriptor& lock) {
  const int flags = O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW;
  lock = FileDescriptor(open(file.c_str(), flags, 0600));
  if (!lock.IsOpen()) return file + ": " + std::strerror(errno);
  if (flock(lock.Get(), LOCK_EX | LOCK_NB) == 0) return {};
  return errno == EWOULDBLOCK ? busy : file + ": " + std::strerror(errno);
}

}  // namespace

std::string LockIndex(const IndexFile& database, FileDescriptor& lock) {
  MakeIndexDirectory(database);
  return Lock(database.path + ".lock", "another instance uses " + database.path, lock);
}

std::string LockSocket(const std::string& path, FileDescriptor& lock) {
  // Where everybody may make files, a lock could be anybody's; root has a better place.
  const std::string file = geteuid() == 0 ? kRootsSocketLock : path + ".lock";
  return Lock(file, "another instance listens at " + path, lock);
}

}  // namespace vela
