#include "smallest_thumb.h"

#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>

#include "platform/velaindex.h"
#include "thumb_size_order.h"

namespace {

/// No picture is shorter than the mark that every JPEG begins with.
constexpr off_t kSmallestThumb = 2;

class ReadDescriptor {
 public:
  /// A pipe put in a thumbnail's place must not stop the scan.
  explicit ReadDescriptor(const char* path)
      : number_(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK)) {}
  ~ReadDescriptor() {
    if (number_ >= 0) {
      close(number_);
    }
  }
  ReadDescriptor(const ReadDescriptor&) = delete;
  ReadDescriptor& operator=(const ReadDescriptor&) = delete;

  int Get() const { return number_; }

 private:
  const int number_;
};

bool IsEmbeddable(const struct stat& file) {
  return S_ISREG(file.st_mode) && file.st_size >= kSmallestThumb &&
         static_cast<uint64_t>(file.st_size) <= kLargestEmbeddedThumb;
}

/// Returns at most `size` bytes from the beginning, nothing after a read error.
std::string ReadBytes(int file, size_t size) {
  std::string bytes(size, '\0');
  size_t length = 0;
  while (length < size) {
    const ssize_t count = read(file, &bytes[length], size - length);
    if (count < 0 && errno == EINTR) {
      continue;
    }
    if (count < 0) {
      return std::string();
    }
    if (count == 0) {
      break;
    }
    length += static_cast<size_t>(count);
  }
  bytes.resize(length);
  return bytes;
}

std::string ReadThumb(const char* path) {
  const ReadDescriptor file(path);
  struct stat status = {};
  if (file.Get() < 0 || fstat(file.Get(), &status) != 0 || !IsEmbeddable(status)) {
    return std::string();
  }
  return ReadBytes(file.Get(), static_cast<size_t>(status.st_size));
}

}  // namespace

std::string ReadSmallestThumb(const std::string& path) {
  for (const EA_THUMB_SIZE size : kThumbSizesSmallestFirst) {
    const EAThumbInfo& row = rgEAThumbInfo[size];
    char thumb[PATH_MAX] = "";
    if (GetEAFilePath(path.c_str(), row.name, row.oldName, thumb, sizeof thumb) != 0) {
      continue;
    }
    std::string bytes = ReadThumb(thumb);
    if (!bytes.empty()) {
      return bytes;
    }
  }
  return std::string();
}
