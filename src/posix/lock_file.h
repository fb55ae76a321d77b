// Files that exist only to be locked.
#pragma once

#include <string>

#include "posix/file_descriptor.h"

namespace vela {

/// Locks the file `path` exclusively, without waiting, until `lock` is closed. Creates it when it
/// is missing, for its owner only. Returns 0, EWOULDBLOCK when another process holds the lock, or
/// another errno value.
int LockFile(const std::string& path, FileDescriptor& lock);

}  // namespace vela
