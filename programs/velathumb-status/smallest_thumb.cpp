#include "smallest_thumb.h"

#include <limits.h>

#include <string_view>

#include "platform/velaindex.h"
#include "posix/file_content.h"
#include "storage/thumb_size_class.h"

namespace vela {

namespace {

/// Metadata directories are writable for all users: a file that does not begin like a JPEG must not
/// get into the page, nor the target of a link.
constexpr std::string_view kJpegBegin = "\xff\xd8\xff";

std::string ReadThumb(const char* path) {
  std::string bytes = ReadSmallFile(path, kLargestEmbeddedThumb);
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
