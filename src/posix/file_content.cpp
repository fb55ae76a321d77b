#include "posix/file_content.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <new>
#include <stdexcept>

#include "posix/file_descriptor.h"

namespace vela {

namespace {

constexpr size_t kChunkSize = 16384;

int AppendToEnd(int fd, std::string& content) {
  char chunk[kChunkSize];
  for (;;) {
    const ssize_t got = read(fd, chunk, sizeof(chunk));
    if (got == 0) return 0;
    if (got > 0) {
      content.append(chunk, static_cast<size_t>(got));
    } else if (errno != EINTR) {
      return errno;
    }
  }
}

}  // namespace

int ReadToEnd(int fd, std::string& content) {
  try {
    return AppendToEnd(fd, content);
  } catch (const std::bad_alloc&) {
    return ENOMEM;
  } catch (const std::length_error&) {
    return EFBIG;
  }
}

int ReadFile(const char* path, std::string& content) {
  const FileDescriptor file(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  if (!file.IsOpen()) return errno;
  return ReadToEnd(file.Get(), content);
}

int WriteAll(int fd, std::string_view content) {
  while (!content.empty()) {
    const ssize_t written = write(fd, content.data(), content.size());
    if (written >= 0) {
      content.remove_prefix(static_cast<size_t>(written));
    } else if (errno != EINTR) {
      return errno;
    }
  }
  return 0;
}

}  // namespace vela
