// Paths in directories that other users may change.
#pragma once

#include <optional>
#include <string>

#include "posix/file_descriptor.h"

namespace vela {

/// A name in an open directory. The directory cannot be exchanged for another one.
struct Place {
  FileDescriptor directory;  ///< only for reaching what is below it
  std::string name;          ///< the last component of a path
};

/// Finds the place of a file that may not exist yet. A symbolic link among the directories is
/// followed only if it belongs to root, the effective user or the owner of the directory that it
/// leads to. Empty, with errno set, when there is no such directory or `path` does not end with a
/// file name; ELOOP for any other link.
std::optional<Place> FindPlace(const std::string& path);

/// Opens the file at `path` for reading without waiting for the writer of a pipe. Symbolic links
/// are followed under the same condition. No open descriptor, with errno set, on failure.
FileDescriptor OpenTrusted(const std::string& path);

/// Returns true when nobody but root and the effective user can create or replace names in this
/// directory or exchange a directory above it.
bool IsPrivate(const FileDescriptor& directory);

}  // namespace vela
