#include <sys/statvfs.h>

#include <cerrno>

#include "platform/standalone/last_error.h"
#include "platform/vlibc.h"

uint64_t VLIBGetFsAvailSize(const char* path) {
  if (path == nullptr) {
    vela::SetLastError(EINVAL);
    return 0;
  }
  struct statvfs volume;
  while (statvfs(path, &volume) != 0) {
    if (errno == EINTR) {
      continue;
    }
    vela::SetLastError(errno);
    return 0;
  }
  return static_cast<uint64_t>(volume.f_bavail) * volume.f_frsize;
}
