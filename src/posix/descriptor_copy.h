// Copying what a descriptor gives to another one.
#pragma once

#include <cstdint>

namespace vela {

/// How a copy ended.
enum class CopyEnd {
  kComplete,
  kReadFailed,
  kWriteFailed,
  kWriteCut,  ///< the system took only a part of a piece
};

struct CopyResult {
  CopyEnd end = CopyEnd::kComplete;
  int64_t total = 0;  ///< bytes that were copied in full pieces
  int error = 0;      ///< errno of a read or write that failed
  int64_t piece = 0;  ///< bytes of the piece that was cut
  int64_t taken = 0;  ///< bytes of it that were written
};

/// Copies everything from descriptor `from` to descriptor `to`, from and to their present
/// positions.
CopyResult CopyDescriptor(int from, int to);

}  // namespace vela
