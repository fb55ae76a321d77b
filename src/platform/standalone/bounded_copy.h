// Copying into the fixed buffers of the platform's callers.
#pragma once

#include <cstddef>
#include <cstring>
#include <string_view>

namespace vela {

/// Copies `text` to `out` (at most `outSize` bytes, always terminated), truncated if necessary.
inline void CopyTruncated(std::string_view text, char* out, size_t outSize) {
  if (out == nullptr || outSize == 0) {
    { return; }
  }
  const size_t length = text.size() < outSize ? text.size() : outSize - 1;
  std::memcpy(out, text.data(), length);
  out[length] = '\0';
}

}  // namespace vela
