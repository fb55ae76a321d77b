// Owner of a file descriptor.
#pragma once

#include <unistd.h>

#include <cerrno>
#include <utility>

namespace vela {

/// Closes its descriptor when it goes out of scope; a negative number means none.
class FileDescriptor {
 public:
  FileDescriptor() = default;
  explicit FileDescriptor(int fd) : fd_(fd) {}
  FileDescriptor(FileDescriptor&& other) noexcept : fd_(other.Release()) {}
  FileDescriptor& operator=(FileDescriptor&& other) noexcept {
    Reset(other.Release());
    return *this;
  }
  ~FileDescriptor() { Reset(); }

  int Get() const { return fd_; }
  bool IsOpen() const { return fd_ >= 0; }

  /// Gives up ownership; the caller closes the descriptor.
  int Release() { return std::exchange(fd_, -1); }

  /// Closes the descriptor, if any, and owns `fd` instead. Preserves errno.
  void Reset(int fd = -1) {
    const int old = std::exchange(fd_, fd);
    if (old < 0 || old == fd) {
      return;
    }
    const int savedErrno = errno;
    close(old);
    errno = savedErrno;
  }

  /// Closes the descriptor, if any. Returns false, with errno set, when written data may be lost.
  bool Close() {
    const int old = Release();
    return old < 0 || close(old) == 0;
  }

 private:
  int fd_ = -1;
};

}  // namespace vela
