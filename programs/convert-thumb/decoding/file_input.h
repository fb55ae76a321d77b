// Input for libraries that read through a callback.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

namespace vela {

/// Reads a file from its start, regardless of the descriptor's position, which does not change.
class FileInput {
 public:
  /// Real photos have less data than this in front of the first samples; files with more were
  /// crafted to waste time.
  static constexpr int64_t kMaxBytes = int64_t{16} << 20;

  explicit FileInput(int descriptor) : descriptor_(descriptor) {}

  /// Reads up to `size` bytes. Returns their number, which is smaller only at the end of the file
  /// or after kMaxBytes.
  int Read(unsigned char* bytes, int size);

 private:
  bool Fill();

  int descriptor_;
  int64_t offset_ = 0;  ///< in the file, after the buffer
  std::array<unsigned char, 65536> buffer_;
  size_t begin_ = 0;  ///< start of the bytes that have not been read
  size_t end_ = 0;
};

}  // namespace vela
