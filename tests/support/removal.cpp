#include "support/removal.h"

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "support/environment_failure.h"
#include "support/files.h"

namespace vela_test {

namespace {

bool IsRemoved(int result) {
  return result == 0 || errno == ENOENT;
}

}  // namespace

uint64_t MountAt(const std::string& path) {
  struct statx status {};
  const bool known = statx(AT_FDCWD, path.c_str(), 0, STATX_MNT_ID, &status) == 0;
  return known ? status.stx_mnt_id : 0;
}

void UnmountAll(const std::string& path) {
  while (umount2(path.c_str(), MNT_DETACH | UMOUNT_NOFOLLOW) == 0) {
  }
}

void RemoveWithMounts(const std::string& path) {
  if (IsRemoved(unlink(path.c_str()))) {
    return;
  }
  UnmountAll(path);
  if (IsRemoved(unlink(path.c_str()))) {
    return;
  }
  RemoveContent(path);
  if (!IsRemoved(rmdir(path.c_str()))) {
    EnvironmentFailureWithErrno("cannot remove " + path);
  }
}

void RemoveContent(const std::string& directory) {
  for (const std::string& name : ListDirectory(directory)) {
    RemoveWithMounts(directory + "/" + name);
  }
}

}  // namespace vela_test
