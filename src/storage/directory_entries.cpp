#include "storage/directory_entries.h"

#include "platform/velaindex.h"
#include "posix/cut_text.h"
#include "storage/velamk_thumb_status.h"

using vela::CutText;
using vela::DirectoryEntries;
using vela::kPathBufferSize;

namespace vela {

std::string DirectoryEntryPath(const char* dir, const char* name) {
  std::string path = dir;
  path += '/';
  path += name;
  return path.size() < kPathBufferSize ? path : CutText(path);
}

}  // namespace vela

int CountDirEntries(const char* path) {
  if (IsDirExist(path) == 0) {
    return 0;
  }
  DirectoryEntries entries(path);
  if (!entries.IsOpen()) {
    return 0;
  }
  int count = 0;
  while (entries.NextName() != nullptr) {
    ++count;
  }
  return count;
}
