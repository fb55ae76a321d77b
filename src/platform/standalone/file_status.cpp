#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <string>

#include "platform/standalone/last_error.h"
#include "platform/vlibc.h"
#include "posix/folder.h"

namespace {

using vela::Fail;

constexpr int kSetAccessTime = 1;
constexpr int kSetModificationTime = 2;
constexpr int64_t kNanosecondsPerSecond = 1000000000;

VLIBCTime ToPlatformTime(const timespec& time) {
  return {time.tv_sec, time.tv_nsec};
}

/// The system gives special meanings to some nanosecond values above a second; a caller's record
/// must not contain any.
bool IsValidTime(const VLIBCTime& time) {
  return time.nanoseconds >= 0 && time.nanoseconds < kNanosecondsPerSecond;
}

timespec ToSystemTime(const VLIBCTime& time, bool isSet) {
  if (!isSet) {
    return {0, UTIME_OMIT};
  }
  return {static_cast<time_t>(time.seconds), static_cast<long>(time.nanoseconds)};
}

/// Sets the times of a directory or of a file that is this user's own: in a directory that others
/// can change, the path may lead to a file of theirs. Returns 0 or an errno value.
int SetTimes(const char* path, const timespec (&times)[2]) {
  const vela::FileDescriptor file = vela::FolderEntry(path).Open(O_PATH);
  struct stat status;
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0) {
    return errno;
  }
  if (!S_ISDIR(status.st_mode) && !vela::IsOwnFile(status)) {
    return EPERM;
  }
  if (utimensat(file.Get(), "", times, AT_EMPTY_PATH) == 0) {
    return 0;
  }
  if (errno != EINVAL) {
    return errno;
  }
  // Kernels before 5.8 cannot do that.
  const std::string name = "/proc/self/fd/" + std::to_string(file.Get());
  return utimensat(AT_FDCWD, name.c_str(), times, 0) == 0 ? 0 : errno;
}

}  // namespace

int VLIBCFileStat(const char* path, int /*options*/, VLIBCFileStatus* out) {
  if (path == nullptr || out == nullptr) {
    return Fail(EINVAL);
  }
  struct stat status;
  if (const int error = vela::ReadStatus(path, status); error != 0) {
    return Fail(error);
  }
  out->mode = status.st_mode;
  out->size = status.st_size;
  out->blocks = status.st_blocks;
  out->access = ToPlatformTime(status.st_atim);
  out->modification = ToPlatformTime(status.st_mtim);
  out->change = ToPlatformTime(status.st_ctim);
  return 0;
}

int VLIBCFileUTime(const char* path, int options, const VLIBCFileTimes* times) {
  if (path == nullptr || times == nullptr) {
    return Fail(EINVAL);
  }
  const bool setAccess = (options & kSetAccessTime) != 0;
  const bool setModification = (options & kSetModificationTime) != 0;
  if (setAccess && !IsValidTime(times->access)) {
    return Fail(EINVAL);
  }
  if (setModification && !IsValidTime(times->modification)) {
    return Fail(EINVAL);
  }
  const timespec pair[2] = {ToSystemTime(times->access, setAccess),
                            ToSystemTime(times->modification, setModification)};
  const int error = SetTimes(path, pair);
  return error == 0 ? 0 : Fail(error);
}
