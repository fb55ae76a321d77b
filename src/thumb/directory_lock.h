// Keeps a second instance out of a directory.
#pragma once

#include <string>

namespace vela {

/// Holds the exclusive lock on one metadata root until it is destroyed.
class DirectoryLock {
 public:
  /// Locks the directory `path` without waiting. A failure is logged and leaves the lock not held.
  explicit DirectoryLock(const std::string& path);
  ~DirectoryLock();
  DirectoryLock(const DirectoryLock&) = delete;
  DirectoryLock& operator=(const DirectoryLock&) = delete;

  bool IsHeld() const { return descriptor_ >= 0; }

 private:
  int descriptor_ = -1;
};

}  // namespace vela
