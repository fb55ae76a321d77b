// Detects changes of a file since it was read.
#pragma once

#include <sys/stat.h>

#include <cstdint>

namespace vela {

/// Returns true when both records describe the same file.
bool IsSameFile(const struct stat& a, const struct stat& b);

/// One state of a file, links followed. The default equals that of no file.
class FileVersion {
 public:
  /// Reads the present version. Returns 0 or an errno value.
  int Read(const char* path);
  int Read(int fd);

  /// Returns whether both are the same file in the same state.
  bool operator==(const FileVersion& other) const;
  bool operator!=(const FileVersion& other) const { return !(*this == other); }

  bool IsRegular() const { return S_ISREG(status_.st_mode); }

  /// Returns true when the file has not changed for a while. Times of files advance in steps of a
  /// timer tick, so a change within the same tick is not visible: only a file that has been at rest
  /// can be identified by its times.
  bool IsAtRest() const;

  /// Bytes.
  int64_t Size() const { return status_.st_size; }

 private:
  struct stat status_ = {};
};

}  // namespace vela
