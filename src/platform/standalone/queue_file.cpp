#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <utility>

#include "platform/standalone/last_error.h"
#include "platform/velaindex.h"
#include "posix/file_descriptor.h"
#include "posix/file_lock.h"
#include "posix/file_version.h"

namespace {

using vela::Fail;
using vela::FileDescriptor;

constexpr mode_t kQueueMode = 0644;
constexpr int kFlags = O_RDWR | O_APPEND | O_CLOEXEC | O_NONBLOCK | O_NOCTTY;

/// Opens the queue file. Creates it when it is missing, with its mode whatever the umask. Returns 0
/// or an errno value.
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
      return fchmod(file.Get(), kQueueMode) == 0 ? 0 : errno;
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
  FileDescriptor file;
  struct stat status;
};

/// Returns 0 or an errno value. Sets `isCurrent` unless the file was renamed or removed before it
/// was locked, which the program that processes the queue does.
int LockQueue(const char* path, Queue& queue, bool& isCurrent) {
  int error = OpenQueue(path, queue.file);
  if (error != 0) {
    return error;
  }
  error = vela::LockExclusively(queue.file.Get());
  if (error != 0) {
    return error;
  }
  if (fstat(queue.file.Get(), &queue.status) != 0) {
    return errno;
  }
  if (!S_ISREG(queue.status.st_mode)) {
    return EINVAL;
  }
  struct stat named;
  if (stat(path, &named) != 0) {
    return errno == ENOENT ? 0 : errno;
  }
  isCurrent = vela::IsSameFile(queue.status, named);
  return 0;
}

bool LacksFinalNewline(const Queue& queue) {
  if (queue.status.st_size == 0) {
    return false;
  }
  char last = '\n';
  const ssize_t got = pread(queue.file.Get(), &last, 1, queue.status.st_size - 1);
  return got == 1 && last != '\n';
}

/// Appends the text completely or not at all. Returns 0 or an errno value.
int AppendAtomically(const Queue& queue, const std::string& text) {
  ssize_t written;
  do {
    written = write(queue.file.Get(), text.data(), text.size());
  } while (written < 0 && errno == EINTR);
  if (written == static_cast<ssize_t>(text.size())) {
    return 0;
  }
  if (written < 0) {
    return errno;
  }
  // A part of a line would be read as another path.
  return ftruncate(queue.file.Get(), queue.status.st_size) == 0 ? ENOSPC : errno;
}

}  // namespace

int WriteIndexQueue(const char* path, const char* queueFile) {
  if (path == nullptr || queueFile == nullptr || *path == '\0') {
    return Fail(EINVAL);
  }
  if (strchr(path, '\n') != nullptr) {
    return Fail(EINVAL);
  }
  Queue queue;
  for (bool isCurrent = false; !isCurrent;) {
    const int error = LockQueue(queueFile, queue, isCurrent);
    if (error != 0) {
      return Fail(error);
    }
  }
  std::string line(LacksFinalNewline(queue) ? "\n" : "");
  line += path;
  line += '\n';
  const int error = AppendAtomically(queue, line);
  return error == 0 ? 0 : Fail(error);
}
