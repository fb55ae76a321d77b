#include "smallest_thumb.h"

#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <string_view>

#include "platform/velaindex.h"
#include "posix/file_descriptor.h"
#include "storage/thumb_size_class.h"

namespace vela {

namespace {

/// Everybody may write into a metadata directory: what does not begin as every JPEG does is not for
/// the page, nor is what a link leads to.
constexpr std::string_view kJpegBegin = "\xff\xd8\xff";

bool IsEmbeddable(const struct stat& file) {
  return S_ISREG(file.st_mode) && static_cast<uint64_t>(file.st_size) <= kLargestEmbeddedThumb;
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
  // A pipe put in a thumbnail's place must not stop the scan.
  const FileDescriptor file(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOFOLLOW));
  struct stat status = {};
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0 || !IsEmbeddable(status)) {
    return std::string();
  }
  std::string bytes = ReadBytes(file.Get(), static_cast<size_t>(status.st_size));
  const bool isJpeg = bytes.compare(0, kJpegBegin.size(), kJpegBegin) == 0;
  return isJpeg ? bytes : std::string();
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

}  // namespace vela
