#include <fcntl.h>
#include <stdlib.h>
#include <sys/stat.h>

#include <cerrno>
#include <memory>
#include <string>

#include "configuration/key_value_text.h"
#include "platform/standalone/bounded_copy.h"
#include "platform/standalone/last_error.h"
#include "platform/vlibc.h"
#include "posix/file_content.h"
#include "posix/file_descriptor.h"
#include "posix/file_lock.h"
#include "posix/file_replacement.h"
#include "posix/file_version.h"

namespace {

using vela::Fail;
using vela::FileDescriptor;

struct FreeMemory {
  void operator()(char* memory) const { free(memory); }
};

/// Replaces `path` by the target of the link at `path`. Returns 0 or an errno value.
int FollowLink(std::string& path) {
  const std::unique_ptr<char, FreeMemory> target(realpath(path.c_str(), nullptr));
  if (!target) {
    return errno;
  }
  path = target.get();
  return 0;
}

/// The result of one attempt to set a value.
enum class Attempt { kDone, kRetry };

int CreateWithValue(std::string& path, const char* key, const char* value, Attempt& attempt) {
  const int error = vela::CreateAtomically(path, vela::WithValue("", key, value));
  if (error != EEXIST) {
    return error;
  }
  // Another process was faster, or the path is a link to a missing file.
  struct stat named;
  if (lstat(path.c_str(), &named) == 0 && S_ISLNK(named.st_mode)) {
    const int linkError = FollowLink(path);
    if (linkError != 0) {
      return linkError;
    }
  }
  attempt = Attempt::kRetry;
  return 0;
}

/// Changes `path`, when it is a link, to the file that the link leads to. Returns 0 or an errno
/// value, also for anything but a regular file or none.
int FindFile(std::string& path) {
  struct stat named;
  if (lstat(path.c_str(), &named) != 0) {
    return errno == ENOENT ? 0 : errno;
  }
  if (S_ISLNK(named.st_mode)) {
    return FollowLink(path);
  }
  if (S_ISDIR(named.st_mode)) {
    return EISDIR;
  }
  return S_ISREG(named.st_mode) ? 0 : EINVAL;
}

/// With the lock held, checks whether the locked file is still the one at `path`. When `path` is a
/// link, changes it to the link's target, because that is the file to replace.
int CheckIdentity(std::string& path, const struct stat& locked, Attempt& attempt) {
  struct stat named;
  attempt = Attempt::kRetry;
  if (lstat(path.c_str(), &named) != 0) {
    return errno == ENOENT ? 0 : errno;
  }
  if (S_ISLNK(named.st_mode)) {
    return FollowLink(path);
  }
  if (vela::IsSameFile(locked, named)) {
    attempt = Attempt::kDone;
  }
  return 0;
}

int TrySetValue(std::string& path, const char* key, const char* value, Attempt& attempt) {
  attempt = Attempt::kDone;
  int error = FindFile(path);
  vela::FileGuard guard;
  if (error == 0) {
    error = guard.Take(path);
  }
  if (error != 0) {
    return error;
  }
  const FileDescriptor file(open(path.c_str(), O_RDWR | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  if (!file.IsOpen()) {
    return errno == ENOENT ? CreateWithValue(path, key, value, attempt) : errno;
  }
  struct stat locked;
  if (fstat(file.Get(), &locked) != 0) {
    return errno;
  }
  if (!S_ISREG(locked.st_mode)) {
    return EINVAL;
  }
  error = guard.LockToo(file.Get());
  if (error != 0) {
    return error;
  }
  error = CheckIdentity(path, locked, attempt);
  if (error != 0 || attempt == Attempt::kRetry) {
    return error;
  }

  std::string text;
  error = vela::ReadToEnd(file.Get(), text);
  if (error != 0) {
    return error;
  }
  return vela::ReplaceAtomically(path, vela::WithValue(text, key, value), locked);
}

}  // namespace

int VLIBCFileGetKeyValue(const char* file, const char* key, char* out, size_t outSize,
                         int /*flags*/) {
  vela::CopyTruncated("", out, outSize);
  if (file == nullptr || key == nullptr) {
    return Fail(EINVAL);
  }
  std::string text;
  const int error = vela::ReadFile(file, text);
  if (error != 0) {
    return Fail(error);
  }
  const auto value = vela::FindValue(text, key);
  if (!value) {
    return 0;
  }
  vela::CopyTruncated(*value, out, outSize);
  return 1;
}

int VLIBCFileSetKeyValue(const char* file, const char* key, const char* value, int /*flags*/) {
  if (file == nullptr || key == nullptr || value == nullptr) {
    return Fail(EINVAL);
  }
  if (!vela::IsStorable(key, value)) {
    return Fail(EINVAL);
  }
  std::string path(file);
  Attempt attempt = Attempt::kRetry;
  while (attempt == Attempt::kRetry) {
    const int error = TrySetValue(path, key, value, attempt);
    if (error != 0) {
      return Fail(error);
    }
  }
  return 0;
}

int VLIBCFileCheckKeyValue(const char* file, const char* key, const char* value, int /*flags*/) {
  if (file == nullptr || key == nullptr || value == nullptr) {
    vela::SetLastError(EINVAL);
    return 0;
  }
  std::string text;
  const int error = vela::ReadFile(file, text);
  if (error != 0) {
    vela::SetLastError(error);
    return 0;
  }
  const auto found = vela::FindValue(text, key);
  return found && *found == value ? 1 : 0;
}
