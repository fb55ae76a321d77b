#include "posix/file_content.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <new>
#include <stdexcept>

#include "posix/file_descriptor.h"
#include "posix/file_reading.h"
#include "posix/files.h"

namespace vela {

namespace {

constexpr size_t kChunkSize = 16384;

int AppendToEnd(int fd, std::string& content) {
  char chunk[kChunkSize];
  for (;;) {
    size_t got = 0;
    const int error = ReadChunk(fd, chunk, sizeof(chunk), got);
    if (error != 0 || got == 0) {
      return error;
    }
    content.append(chunk, got);
  }
}

/// Returns at most `size` bytes from the beginning, nothing after an error: the file may grow
/// meanwhile.
std::string ReadBytes(int fd, size_t size) {
  std::string bytes(size, '\0');
  size_t length = 0;
  while (length < size) {
    const ssize_t count = read(fd, &bytes[length], size - length);
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return {};
    if (count == 0) break;
    length += static_cast<size_t>(count);
  }
  bytes.resize(length);
  return bytes;
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
  const FileDescriptor file = OpenForReading(path);
  if (!file.IsOpen()) {
    return errno;
  }
  return ReadToEnd(file.Get(), content);
}

std::string ReadSmallFile(const std::string& path, size_t limit) {
  const int flags = O_RDONLY | O_NONBLOCK | O_NOFOLLOW | O_NOCTTY | O_CLOEXEC;
  const FileDescriptor file(open(path.c_str(), flags));
  struct stat status = {};
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0) return {};
  if (!S_ISREG(status.st_mode) || static_cast<uint64_t>(status.st_size) > limit) return {};
  return ReadBytes(file.Get(), static_cast<size_t>(status.st_size));
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
