// Writing outputs and replacing files.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "posix/file_descriptor.h"
#include "process/trusted_path.h"

namespace vela {

/// An output that is open for writing.
struct OpenOutput {
  FileDescriptor file;    ///< not open when the output is refused; errno is set then
  bool isDevice = false;  ///< not a file of this run
};

/// Opens an output: a new file with mode 0666 reduced by the file creation mask. An existing file
/// is replaced if it is a regular file of the effective user with a single name. Also accepted are
/// the null device, by any name, and another character device in a directory that nobody else can
/// change. Everything else is refused: symbolic links, pipes, files of other users or with several
/// names. May be called by any thread.
OpenOutput OpenForWriting(const std::string& path);

/// Writes the whole file, as opened by OpenForWriting. Returns false when it is refused or some
/// bytes may not have been written; the incomplete file is removed. May be called by any thread.
bool WriteOutputFile(const std::string& path, const unsigned char* bytes, size_t size);

/// Returns true when another program may write to `file`, the open file at `path`: a regular file
/// of the effective user with a single name and not behind a symbolic link, or any file whose name
/// is in a directory that nobody else can change.
bool MayBeOverwritten(const std::string& path, const FileDescriptor& file);

/// The attributes that a replacement shares with the file that it replaces.
struct FileAttributes {
  unsigned owner = 0;
  unsigned group = 0;
  unsigned mode = 0;  ///< type and permission bits
};

/// A file that ReplaceFile can replace.
struct ReplaceableFile {
  Place place;
  FileAttributes attributes;
  std::vector<unsigned char> bytes;
};

/// Reads a file that a new file can fully replace: a regular file of this process's user and group
/// with a single name and no extended attributes, and not through a symbolic link. Empty for any
/// other file, one that cannot be read, and one of more than `limit` bytes.
std::optional<ReplaceableFile> ReadReplaceableFile(const std::string& path, size_t limit);

/// Result of replacing a file.
enum class Replacement {
  kDone,
  kFailed,      ///< errno is set
  kImpossible,  ///< no new file with the same attributes can be created there
};

/// Atomically replaces the file with a new one that has the same attributes and no others. The old
/// file is unchanged unless the result is kDone. Called while there is one thread.
Replacement ReplaceFile(const ReplaceableFile& former, const unsigned char* bytes, size_t size);

}  // namespace vela
