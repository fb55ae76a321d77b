// Feeds libraries that ask for bytes by a function.
#pragma once

#include <sys/types.h>

#include <cstddef>

/// Reads a file from its start, whatever place its descriptor reads from, and leaves that alone.
class FileInput {
 public:
  explicit FileInput(int descriptor) : descriptor_(descriptor) {}

  /// Reads up to `size` bytes to `bytes`; returns how many, fewer only at the file's end.
  int Read(unsigned char* bytes, int size);

 private:
  int descriptor_;
  off_t place_ = 0;
};
