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

/// Finds the place of a file that may not exist yet. Symbolic links among the directories are
/// followed if they are trusted (see posix/folder.h). Empty, with errno set, when there is no such
/// directory or `path` does not end with a file name.
std::optional<Place> FindPlace(const std::string& path);

/// Opens the file at `path` for reading without waiting for the writer of a pipe. Trusted symbolic
/// links are followed. No open descriptor, with errno set, on failure.
FileDescriptor OpenSource(const std::string& path);

/// Returns true when nobody but root and the effective user can create or replace names in this
/// directory or exchange a directory above it.
bool IsPrivate(const FileDescriptor& directory);

/// Returns true when nobody but root and the effective user can replace files of theirs in the
/// directory at `path`, although others may perhaps create files there, as in /tmp.
bool ProtectsOwnFiles(const std::string& path);

/// Returns true when there is nothing at the place.
bool IsAbsent(const Place& place);

/// Removes a regular file at the place.
void RemoveRegular(const Place& place);

}  // namespace vela
