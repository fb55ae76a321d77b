#include "decoding/file_input.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>

namespace vela {

int FileInput::Read(unsigned char* bytes, int size) {
  const size_t wanted = size > 0 ? static_cast<size_t>(size) : 0;
  size_t done = 0;
  while (done < wanted && (begin_ < end_ || Fill())) {
    const size_t count = std::min(wanted - done, end_ - begin_);
    std::copy_n(buffer_.data() + begin_, count, bytes + done);
    begin_ += count;
    done += count;
  }
  return static_cast<int>(done);
}

bool FileInput::Fill() {
  const auto room = static_cast<off_t>(buffer_.size());
  const auto size = static_cast<size_t>(std::min(room, kMostBytes - place_));
  ssize_t count = 0;
  do {
    count = pread(descriptor_, buffer_.data(), size, place_);
  } while (count < 0 && errno == EINTR);
  if (count <= 0) {
    return false;
  }
  place_ += count;
  begin_ = 0;
  end_ = static_cast<size_t>(count);
  return true;
}

}  // namespace vela
