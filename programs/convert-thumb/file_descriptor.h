// Owner of a file descriptor.
#pragma once

#include <unistd.h>

/// Closes its descriptor; -1 for none.
class FileDescriptor {
 public:
  explicit FileDescriptor(int number) : number_(number) {}
  ~FileDescriptor() { Close(); }
  FileDescriptor(const FileDescriptor&) = delete;
  FileDescriptor& operator=(const FileDescriptor&) = delete;

  int Get() const { return number_; }
  bool IsOpen() const { return number_ >= 0; }

  /// False when what was written may not have arrived.
  bool Close() {
    const bool closed = number_ < 0 || close(number_) == 0;
    number_ = -1;
    return closed;
  }

 private:
  int number_;
};
