#include "posix/file_replacement.h"

#include <fcntl.h>
#include <stdio.h>
#include <unistd.h>

#include <cerrno>
#include <utility>

#include "posix/file_content.h"
#include "posix/file_descriptor.h"
#include "posix/file_lock.h"
#include "posix/file_version.h"

namespace vela {

namespace {

constexpr mode_t kNewFileMode = 0644;
constexpr mode_t kPermissionBits = 07777;
constexpr mode_t kBitsOfOthers = 077;

/// A writer that was killed leaves its file; more of them are the work of another process.
constexpr int kOpenTries = 100;

/// The new file while it is written, next to its target and under the same name for all writers, so
/// that the next writer finds and removes one left by a killed writer. Its lock shows whether its
/// writer is still running.
class ScratchFile {
 public:
  explicit ScratchFile(const std::string& target) : path_(target + ".replacement") {}
  ScratchFile(const ScratchFile&) = delete;
  ScratchFile& operator=(const ScratchFile&) = delete;
  ~ScratchFile() {
    if (file_.IsOpen()) {
      unlink(path_.c_str());
    }
  }

  /// Creates the file, empty and locked. Returns 0 or an errno value.
  int Open();

  int Fd() const { return file_.Get(); }
  const struct stat& Status() const { return status_; }
  const char* Path() const { return path_.c_str(); }

  /// Called when the file has been renamed.
  void Forget() { file_.Reset(); }

 private:
  int OpenOnce(bool& isReady);
  int Remove() const { return unlink(Path()) == 0 || errno == ENOENT ? 0 : errno; }

  std::string path_;
  FileDescriptor file_;
  struct stat status_ {};
};

int ScratchFile::Open() {
  bool isReady = false;
  for (int i = 0; i < kOpenTries && !isReady; ++i) {
    const int error = OpenOnce(isReady);
    if (error != 0) {
      return error;
    }
  }
  return isReady ? 0 : EBUSY;
}

int ScratchFile::OpenOnce(bool& isReady) {
  const int flags = O_RDWR | O_CREAT | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
  FileDescriptor file(open(Path(), flags, 0600));
  if (!file.IsOpen()) {
    return errno;
  }
  struct stat own;
  if (fstat(file.Get(), &own) != 0) {
    return errno;
  }
  if (!S_ISREG(own.st_mode)) {
    return EEXIST;
  }
  // No writer of this user has made it, or it was complete except for its name. Other users can
  // have locked it.
  const bool isPrivate = own.st_uid == geteuid() && (own.st_mode & kBitsOfOthers) == 0;
  const int error = LockExclusively(file.Get(), kForeignLockLimit);
  if (error != 0) {
    return error == EWOULDBLOCK && !isPrivate ? Remove() : error;
  }

  struct stat named;
  if (fstat(file.Get(), &own) != 0) {
    return errno;
  }
  if (lstat(Path(), &named) != 0) {
    return errno == ENOENT ? 0 : errno;
  }
  if (!IsSameFile(own, named)) {
    return 0;
  }
  if (!isPrivate || own.st_size != 0 || own.st_nlink != 1) {
    return Remove();
  }
  file_ = std::move(file);
  status_ = own;
  isReady = true;
  return 0;
}

/// Makes the file with this content. Also returns what some file systems report only when a file is
/// closed, such as an exceeded quota. The file itself stays open, because closing it would release
/// its lock.
int Make(ScratchFile& scratch, std::string_view content) {
  int error = scratch.Open();
  error = error != 0 ? error : WriteAll(scratch.Fd(), content);
  return error != 0 ? error : FlushFile(scratch.Fd());
}

/// Renames unless `to` exists. Returns 0 or an errno value.
int RenameToFreeName(const char* from, const char* to) {
  if (renameat2(AT_FDCWD, from, AT_FDCWD, to, RENAME_NOREPLACE) == 0) {
    return 0;
  }
  if (errno != EINVAL && errno != ENOSYS) {
    return errno;
  }
  // The file system does not support that flag.
  if (link(from, to) != 0) {
    return errno;
  }
  return unlink(from) == 0 ? 0 : errno;
}

}  // namespace

int CreateAtomically(const std::string& path, std::string_view content) {
  ScratchFile scratch(path);
  int error = Make(scratch, content);
  if (error != 0) {
    return error;
  }
  if (fchmod(scratch.Fd(), kNewFileMode) != 0) {
    return errno;
  }
  error = RenameToFreeName(scratch.Path(), path.c_str());
  if (error == 0) {
    scratch.Forget();
  }
  return error;
}

int ReplaceAtomically(const std::string& path, std::string_view content, const struct stat& old) {
  ScratchFile scratch(path);
  if (const int error = Make(scratch, content); error != 0) {
    return error;
  }
  const struct stat& own = scratch.Status();
  const bool isOwnerDifferent = own.st_uid != old.st_uid || own.st_gid != old.st_gid;
  if (isOwnerDifferent && fchown(scratch.Fd(), old.st_uid, old.st_gid) != 0) {
    return errno;
  }
  if (fchmod(scratch.Fd(), old.st_mode & kPermissionBits) != 0) {
    return errno;
  }
  // No fsync: losing the last change in a power failure costs less than waiting for the disk at
  // every change.
  if (rename(scratch.Path(), path.c_str()) != 0) {
    return errno;
  }
  scratch.Forget();
  return 0;
}

}  // namespace vela
