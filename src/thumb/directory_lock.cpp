#include "thumb/directory_lock.h"

#include <utility>

#include "posix/file_lock.h"
#include "posix/folder.h"
#include "posix/log.h"
#include "storage/log_source.h"

namespace vela {

DirectoryLock::DirectoryLock(const std::string& path) {
  FileDescriptor directory = OpenEntry(path);
  if (!directory.IsOpen()) {
    LogError(kProgramLogSource, 844, "Failed to open " + path);
    return;
  }
  if (TryLockExclusively(directory.Get()) != 0) {
    LogError(kProgramLogSource, 849, "Failed to lock " + path);
    return;
  }
  descriptor_ = std::move(directory);
}

DirectoryLock::~DirectoryLock() {
  if (IsHeld()) {
    Unlock(descriptor_.Get());
  }
}

}  // namespace vela
