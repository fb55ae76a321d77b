#include "support/mount_id.h"

#include <fcntl.h>
#include <sys/stat.h>

namespace vela_test {

uint64_t MountAt(const std::string& path) {
  struct statx status {};
  const bool known = statx(AT_FDCWD, path.c_str(), 0, STATX_MNT_ID, &status) == 0;
  return known ? status.stx_mnt_id : 0;
}

}  // namespace vela_test
