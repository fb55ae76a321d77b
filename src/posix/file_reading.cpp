#include "posix/file_reading.h"

#include <unistd.h>

#include <cerrno>

namespace vela {

int ReadChunk(int fd, char* chunk, size_t size, size_t& got) {
  for (;;) {
    const ssize_t count = read(fd, chunk, size);
    if (count >= 0) {
      got = static_cast<size_t>(count);
      return 0;
    }
    if (errno != EINTR) {
      return errno;
    }
  }
}

std::string ReadAt(int fd, int64_t offset, size_t size) {
  std::string bytes(size, '\0');
  size_t length = 0;
  while (length < size) {
    const off_t position = static_cast<off_t>(offset) + static_cast<off_t>(length);
    const ssize_t got = pread(fd, &bytes[length], size - length, position);
    if (got < 0 && errno == EINTR) {
      continue;
    }
    if (got <= 0) {
      break;
    }
    length += static_cast<size_t>(got);
  }
  bytes.resize(length);
  return bytes;
}

int Rewind(int fd) {
  return lseek(fd, 0, SEEK_SET) < 0 ? errno : 0;
}

}  // namespace vela
