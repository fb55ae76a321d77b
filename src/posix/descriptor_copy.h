// Copying data from one descriptor to another.
#pragma once

#include <cstdint>

namespace vela {

/// How a copy ended.
enum class CopyEnd {
  kComplete,
  kReadFailed,
  kWriteFailed,
  kShortWrite,  ///< only a part of a chunk was written
};

struct CopyResult {
  CopyEnd end = CopyEnd::kComplete;
  int64_t total = 0;    ///< bytes copied in complete chunks
  int error = 0;        ///< errno of the failed read or write
  int64_t chunk = 0;    ///< size of the incomplete chunk, bytes
  int64_t written = 0;  ///< bytes of that chunk that were written
};

/// Copies everything from descriptor `from` to descriptor `to`, starting at their current
/// positions. More than `limit` bytes are a failed write with the error EFBIG.
CopyResult CopyDescriptor(int from, int to, int64_t limit);

}  // namespace vela
