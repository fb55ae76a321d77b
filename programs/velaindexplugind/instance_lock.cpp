#include "instance_lock.h"

#include <cerrno>

#include "posix/accounts.h"
#include "posix/file_lock.h"

namespace vela {

namespace {

constexpr char kRootsSocketLock[] = "/run/velaindexplugind.lock";

/// Returns `busy` when another process holds the lock.
StartProblem Lock(const std::string& file, const std::string& busy, FileDescriptor& lock) {
  const int error = LockFile(file, lock);
  if (error == 0) {
    return {};
  }
  return error == EWOULDBLOCK ? StartProblem{busy} : ProblemAt(file, error);
}

}  // namespace

StartProblem LockIndex(const IndexFile& database, FileDescriptor& lock) {
  CreateIndexDirectory(database);
  return Lock(database.path + ".lock", "another instance uses " + database.path, lock);
}

StartProblem LockSocket(const std::string& path, FileDescriptor& lock) {
  // In a directory that all users can write to, the lock could belong to any of them; root has a
  // better place.
  const std::string file = EffectiveUser() == 0 ? kRootsSocketLock : path + ".lock";
  return Lock(file, "another instance listens at " + path, lock);
}

}  // namespace vela
