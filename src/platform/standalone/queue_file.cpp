#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <utility>

#include "platform/standalone/last_error.h"
#include "platform/velaindex.h"
#include "posix/file_content.h"
#include "posix/file_descriptor.h"
#include "posix/file_lock.h"
#include "posix/file_version.h"
#include "posix/files.h"

namespace {

using vela::Fail;
using vela::FileDescriptor;

constexpr mode_t kQueueMode = 0644;
constexpr int kFlags = O_RDWR | O_APPEND | O_CLOEXEC | O_NONBLOCK | O_NOCTTY;

/// Gives a new queue its mode, whatever the umask. Its name is on the disk before the first entry:
/// those who append to it later only wait for their entry. Returns 0 or an errno value.
int FinishNewQueue(const char* path, int fd) {
  return fchmod(fd, kQueueMode) == 0 ? vela::SyncDirectoryOf(path) : errno;
}

/// Opens the queue file, created when missing. Returns 0 or an errno value.
int OpenQueue(const char* path, FileDescriptor& file) {
  for (;;) {
    file.Reset(open(path, kFlags));
    if (file.IsOpen()) {
      return 0;
    }
    if (errno != ENOENT) {
      return errno;
    }
    file.Reset(open(path, kFlags | O_CREAT | O_EXCL, kQueueMode));
    if (file.IsOpen()) {
      return FinishNewQueue(path, file.Get());
    }
    if (errno != EEXIST) {
      return errno;
    }
    // The path is a dangling link, which is left alone, or another writer has just created the
    // file, which may be renamed again at any time.
    struct stat status;
    if (lstat(path, &status) == 0 && S_ISLNK(status.st_mode)) {
      return ENOENT;
    }
  }
}

/// A locked queue file.
struct Queue {
  vela::FileGuard guard;
  FileDescriptor file;
};

/// Returns 0 or an errno value. Sets `isCurrent` unless the file was renamed or removed before it
/// was locked, which the program that processes the queue does.
int LockQueue(const char* path, Queue& queue, bool& isCurrent) {
  int error = OpenQueue(path, queue.file);
  if (error != 0) {
    return error;
  }
  struct stat status;
  if (fstat(queue.file.Get(), &status) != 0) {
    return errno;
  }
  if (!S_ISREG(status.st_mode)) {
    return EINVAL;
  }
  error = queue.guard.LockToo(queue.file.Get());
  if (error != 0) {
    return error;
  }
  struct stat named;
  if (stat(path, &named) != 0) {
    return errno == ENOENT ? 0 : errno;
  }
  isCurrent = vela::IsSameFile(status, named);
  return 0;
}

/// Returns 0 or an errno value.
int AppendLine(const char* path, const std::string& line) {
  Queue queue;
  int error = queue.guard.Take(path);
  for (bool isCurrent = false; error == 0 && !isCurrent;) {
    error = LockQueue(path, queue, isCurrent);
  }
  if (error != 0) {
    return error;
  }
  const char* start = vela::LacksFinalNewline(queue.file.Get()) ? "\n" : "";
  error = vela::AppendWhole(queue.file.Get(), start + line + '\n');
  // Others need not wait for the disk.
  queue.guard.Release();
  vela::Unlock(queue.file.Get());
  return error != 0 ? error : vela::SyncData(queue.file.Get());
}

}  // namespace

int WriteIndexQueue(const char* path, const char* queueFile) {
  if (path == nullptr || queueFile == nullptr || *path == '\0') {
    return Fail(EINVAL);
  }
  if (strchr(path, '\n') != nullptr) {
    return Fail(EINVAL);
  }
  const int error = AppendLine(queueFile, path);
  return error == 0 ? 0 : Fail(error);
}
