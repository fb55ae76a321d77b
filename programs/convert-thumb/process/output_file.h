// Writing outputs and replacing files.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace vela {

/// Writes the whole file: a new one, with mode 0666 reduced by the file creation mask, or over an
/// existing one or a character device. Returns false when some bytes may not have been written or
/// `path` is any other kind of file; the incomplete file is removed. May be called by any thread.
bool WriteOutputFile(const std::string& path, const unsigned char* bytes, size_t size);

/// The attributes that a replacement shares with the file that it replaces.
struct FileAttributes {
  unsigned owner = 0;
  unsigned group = 0;
  unsigned mode = 0;  ///< type and permission bits
};

/// A file that ReplaceFile can replace.
struct ReplaceableFile {
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

/// Atomically replaces the file at `path` with a new one that has the attributes `former` and no
/// others. The old file is unchanged unless the result is kDone. Called while there is one thread.
Replacement ReplaceFile(const std::string& path, const unsigned char* bytes, size_t size,
                        const FileAttributes& former);

}  // namespace vela
