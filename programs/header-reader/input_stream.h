// A stream of a file that is open already.
#pragma once

#include <cstdio>

namespace vela {

/// Reads a copy of a descriptor from its beginning.
class InputStream {
 public:
  explicit InputStream(int fd);
  ~InputStream();
  InputStream(const InputStream&) = delete;
  InputStream& operator=(const InputStream&) = delete;

  bool IsOpen() const { return file_ != nullptr; }
  FILE* Get() const { return file_; }

 private:
  FILE* file_;
  char buffer_[4096];
};

}  // namespace vela
