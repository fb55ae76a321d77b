// Feeds libraries that ask for bytes by a function.
#pragma once

#include <sys/types.h>

#include <array>
#include <cstddef>

namespace vela {

/// Reads the beginning of a file, whatever place its descriptor reads from, and leaves that alone.
class FileInput {
 public:
  /// No photo that is decoded here has more in front of its first samples. A file that goes on and
  /// on before them was made to waste time.
  static constexpr off_t kMostBytes = off_t{16} << 20;

  explicit FileInput(int descriptor) : descriptor_(descriptor) {}

  /// Reads up to `size` bytes to `bytes`; returns how many, fewer only at the file's end or behind
  /// kMostBytes.
  int Read(unsigned char* bytes, int size);

 private:
  bool Fill();

  int descriptor_;
  off_t place_ = 0;  ///< in the file, behind the buffer
  std::array<unsigned char, 65536> buffer_;
  size_t begin_ = 0;  ///< of what has not been handed out
  size_t end_ = 0;
};

}  // namespace vela
