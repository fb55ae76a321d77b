// Keeps a second daemon away from the index and from the socket.
#pragma once

#include <string>

#include "index_file.h"
#include "posix/file_descriptor.h"

namespace vela {

/// Takes the lock beside the index database, for as long as `lock` lives. Makes the database's
/// directory when missing. Returns what went wrong, empty when nothing did.
std::string LockIndex(const IndexFile& database, FileDescriptor& lock);

/// Takes the lock of who makes a socket at `path`, for as long as `lock` lives. Returns what went
/// wrong, empty when nothing did.
std::string LockSocket(const std::string& path, FileDescriptor& lock);

}  // namespace vela
