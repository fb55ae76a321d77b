// Keeps a second daemon from using the index or the socket.
#pragma once

#include <string>

#include "index/index_database.h"
#include "posix/file_descriptor.h"
#include "start_problem.h"

namespace vela {

/// Takes the lock beside the index database until `lock` is closed. Creates the database's
/// directory when it is missing.
StartProblem LockIndex(const IndexFile& database, FileDescriptor& lock);

/// Takes the lock that protects the creation of a socket at `path`, until `lock` is closed.
StartProblem LockSocket(const std::string& path, FileDescriptor& lock);

}  // namespace vela
