#include "output_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

#include "thumb/descriptor.h"

namespace {

bool WriteAll(int descriptor, const unsigned char* bytes, size_t size) {
  while (size > 0) {
    const ssize_t written = write(descriptor, bytes, size);
    if (written < 0 && errno == EINTR) {
      continue;
    }
    if (written <= 0) {
      return false;
    }
    bytes += written;
    size -= static_cast<size_t>(written);
  }
  return true;
}

int OpenForWriting(const std::string& path) {
  return open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC | O_NOCTTY, 0666);
}

}  // namespace

bool WriteOutputFile(const std::string& path, const unsigned char* bytes, size_t size) {
  Descriptor file(OpenForWriting(path));
  if (!file.IsOpen()) {
    return false;
  }
  const bool written = WriteAll(file.Get(), bytes, size);
  if (!file.Close() || !written) {
    unlink(path.c_str());
    return false;
  }
  return true;
}
