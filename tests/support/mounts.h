// Real volume faults: small volumes, full volumes, read-only directories. All inside the sandbox.
#pragma once

#include <cstdint>
#include <string>

namespace vela_test {

/// A separate memory volume at a directory, as long as the object exists (or until the sandbox is
/// reset). Only written data uses memory, whatever the size.
class SmallVolume {
 public:
  /// Mounts a volume of `bytes` (counted in whole pages, rounded up) at `path`; the directory is
  /// made when missing. Mode 0777.
  SmallVolume(std::string path, uint64_t bytes);
  ~SmallVolume();
  SmallVolume(const SmallVolume&) = delete;
  SmallVolume& operator=(const SmallVolume&) = delete;

  const std::string& Path() const { return path_; }

  /// Bytes available to an ordinary user now.
  uint64_t Available() const;

  /// Makes exactly `bytes` (a multiple of PageSize) available by resizing the volume. 0 makes every
  /// further write fail with ENOSPC; it needs at least one page in use.
  void SetAvailable(uint64_t bytes);

  /// The unit the volume counts in, bytes.
  static uint64_t PageSize();

 private:
  std::string path_;
  uint64_t mount_ = 0;
};

/// A directory tree that refuses changes with EROFS, as long as the object exists. Descriptors
/// opened before are not affected.
class ReadOnlyMount {
 public:
  /// `path` is an existing directory or file.
  explicit ReadOnlyMount(std::string path);
  ~ReadOnlyMount();
  ReadOnlyMount(const ReadOnlyMount&) = delete;
  ReadOnlyMount& operator=(const ReadOnlyMount&) = delete;

 private:
  std::string path_;
  uint64_t mount_ = 0;
};

}  // namespace vela_test
