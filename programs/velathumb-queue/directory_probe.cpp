#include "directory_probe.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>
#include <string>

#include "posix/file_descriptor.h"
#include "storage/directory_tree.h"

namespace vela {

namespace {

bool IsDirectoryLocked(const std::string& directory) {
  const std::string metadata = directory + "/@eaDir";
  const FileDescriptor descriptor(open(metadata.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  return descriptor.IsOpen() && flock(descriptor.Get(), LOCK_SH | LOCK_NB) != 0 &&
         errno == EWOULDBLOCK;
}

}  // namespace

bool IsLockedElsewhere(const EntryTarget& target) {
  if (!target.isTree) {
    return IsDirectoryLocked(target.directory);
  }
  bool isLocked = false;
  ForEachIndexedDirectory(target.directory.c_str(), [&](const char* path, bool isReadable) {
    isLocked = isLocked || (isReadable && IsDirectoryLocked(path));
  });
  return isLocked;
}

}  // namespace vela
