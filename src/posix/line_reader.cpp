#include "posix/line_reader.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdlib>

#include "posix/file_descriptor.h"

namespace vela {

LineReader::LineReader(const char* path) {
  FileDescriptor file(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  struct stat status = {};
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0) {
    return;
  }
  if (!S_ISREG(status.st_mode)) {
    errno = S_ISDIR(status.st_mode) ? EISDIR : EINVAL;
    return;
  }
  stream_.reset(fdopen(file.Get(), "r"));
  if (stream_ != nullptr) {
    file.Release();
  }
}

LineReader::~LineReader() {
  std::free(line_);
}

bool LineReader::Next() {
  const ssize_t length = getline(&line_, &capacity_, stream_.get());
  length_ = length < 0 ? 0 : static_cast<size_t>(length);
  return length >= 0;
}

std::string LineReader::WithoutNewline() const {
  const bool hasNewline = length_ > 0 && line_[length_ - 1] == '\n';
  return std::string(line_, length_ - (hasNewline ? 1 : 0));
}

}  // namespace vela
