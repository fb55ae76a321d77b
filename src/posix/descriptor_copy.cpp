#include "posix/descriptor_copy.h"

#include <unistd.h>

#include <cerrno>
#include <cstddef>

namespace vela {

CopyResult CopyDescriptor(int from, int to, int64_t limit) {
  char buffer[4096];
  CopyResult result;
  for (;;) {
    const ssize_t count = read(from, buffer, sizeof buffer);
    if (count == 0) {
      return result;
    }
    if (count < 0) {
      result.end = CopyEnd::kReadFailed;
      result.error = errno;
      return result;
    }
    if (count > limit - result.total) {
      result.end = CopyEnd::kWriteFailed;
      result.error = EFBIG;
      return result;
    }
    const ssize_t written = write(to, buffer, static_cast<size_t>(count));
    if (written < 0) {
      result.end = CopyEnd::kWriteFailed;
      result.error = errno;
      return result;
    }
    if (written != count) {
      result.end = CopyEnd::kShortWrite;
      result.chunk = count;
      result.written = written;
      return result;
    }
    result.total += count;
  }
}

}  // namespace vela
