#include "encoding/output_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "encoding/unfinished_outputs.h"
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

/// Beside `path`, so that it can be renamed to it. The name is short whatever that of `path` is.
std::string ScratchName(const std::string& path) {
  return path.substr(0, path.rfind('/') + 1) + "VELAPHOTO.tmp." + std::to_string(getpid());
}

bool WriteScratchFile(const std::string& path, const unsigned char* bytes, size_t size,
                      mode_t mode) {
  Descriptor file(open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, mode));
  return file.IsOpen() && WriteAll(file.Get(), bytes, size) && file.Close();
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
  NoteOutput(path);
  const bool written = WriteAll(file.Get(), bytes, size);
  if (!file.Close() || !written) {
    unlink(path.c_str());
    return false;
  }
  return true;
}

bool ReplaceFile(const std::string& path, const unsigned char* bytes, size_t size, mode_t mode) {
  const std::string scratch = ScratchName(path);
  // A process of that number that was killed may have left one.
  unlink(scratch.c_str());
  if (WriteScratchFile(scratch, bytes, size, mode) &&
      std::rename(scratch.c_str(), path.c_str()) == 0) {
    return true;
  }
  const int error = errno;
  unlink(scratch.c_str());
  errno = error;
  return false;
}
