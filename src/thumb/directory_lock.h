// Keeps a second instance out of a directory.
#pragma once

#include <string>

#include "posix/file_descriptor.h"

namespace vela {

/// Holds the exclusive lock on one metadata root until it is destroyed.
class DirectoryLock {
 public:
  /// Locks the directory `path` without waiting. A failure is logged and leaves the lock not held.
  explicit DirectoryLock(const std::string& path);
  ~DirectoryLock();
  DirectoryLock(const DirectoryLock&) = delete;
  DirectoryLock& operator=(const DirectoryLock&) = delete;

  bool IsHeld() const { return descriptor_.IsOpen(); }

  /// Returns whether the directory could be opened, but not locked.
  bool IsRefused() const { return isRefused_; }

 private:
  FileDescriptor descriptor_;
  bool isRefused_ = false;
};

}  // namespace vela
