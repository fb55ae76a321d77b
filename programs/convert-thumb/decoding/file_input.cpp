#include "decoding/file_input.h"

#include <algorithm>

#include "process/source_file.h"

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
  const auto capacity = static_cast<int64_t>(buffer_.size());
  const auto size = static_cast<size_t>(std::min(capacity, kMaxBytes - offset_));
  const int64_t count = ReadSomeAt(descriptor_, buffer_.data(), size, offset_);
  if (count <= 0) {
    return false;
  }
  offset_ += count;
  begin_ = 0;
  end_ = static_cast<size_t>(count);
  return true;
}

}  // namespace vela
