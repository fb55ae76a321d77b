#include "input_stream.h"

#include "posix/file_descriptor.h"

namespace vela {

InputStream::InputStream(int fd) : file_(nullptr) {
  FileDescriptor copy(dup(fd));
  if (!copy.IsOpen()) {
    return;
  }
  file_ = fdopen(copy.Get(), "rb");
  if (file_ == nullptr) {
    return;
  }
  copy.Release();
  // To choose a buffer itself, the C library would examine the file with a system call that is
  // blocked.
  std::setvbuf(file_, buffer_, _IOFBF, sizeof buffer_);
  std::rewind(file_);
}

InputStream::~InputStream() {
  if (file_ != nullptr) {
    std::fclose(file_);
  }
}

}  // namespace vela
