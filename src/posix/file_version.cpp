#include "posix/file_version.h"

#include <cerrno>
#include <cstdint>
#include <ctime>

namespace vela {

namespace {

bool IsSameTime(const timespec& a, const timespec& b) {
  return a.tv_sec == b.tv_sec && a.tv_nsec == b.tv_nsec;
}

}  // namespace

bool IsSameFile(const struct stat& a, const struct stat& b) {
  return a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

bool FileVersion::operator==(const FileVersion& other) const {
  return IsSameFile(status_, other.status_) && status_.st_size == other.status_.st_size &&
         IsSameTime(status_.st_mtim, other.status_.st_mtim) &&
         IsSameTime(status_.st_ctim, other.status_.st_ctim);
}

bool FileVersion::IsAtRest() const {
  timespec now;
  if (clock_gettime(CLOCK_REALTIME_COARSE, &now) != 0) {
    return false;
  }
  constexpr int64_t kRestMilliseconds = 100;
  const int64_t age = (now.tv_sec - status_.st_ctim.tv_sec) * 1000 +
                      (now.tv_nsec - status_.st_ctim.tv_nsec) / 1000000;
  return age > kRestMilliseconds;
}

int FileVersion::Read(const char* path) {
  return stat(path, &status_) == 0 ? 0 : errno;
}

int FileVersion::Read(int fd) {
  return fstat(fd, &status_) == 0 ? 0 : errno;
}

}  // namespace vela
