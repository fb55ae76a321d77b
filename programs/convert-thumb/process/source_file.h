// Opening and reading source files.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <string>

#include "posix/file_content.h"
#include "posix/file_descriptor.h"
#include "posix/files.h"

namespace vela {

enum class FileType {
  kNone,  ///< there is no such file, or it cannot be examined
  kRegular,
  kDirectory,
  kPipe,
  kOther,  ///< a device or a socket
};

/// Returns the type of the file at `path`, following symbolic links. Async-signal-safe.
FileType TypeOf(const std::string& path);
FileType TypeOf(int descriptor);

/// Lets programs that this process starts inherit the descriptor. Returns false, with errno set, on
/// failure.
bool PassToPrograms(const FileDescriptor& file);

/// Returns a second descriptor of the same open file; not open, with errno set, on failure.
FileDescriptor Duplicate(int descriptor);

/// Returns a stream that reads from a duplicate of the descriptor; null on failure.
std::FILE* OpenStream(int descriptor);

/// Returns the size of an open file in bytes; -1 on failure.
int64_t SizeOf(int descriptor);

/// Reads up to `size` bytes at the descriptor's position. Returns the number of bytes, 0 at the end
/// of the file and -1 on failure.
int64_t ReadSome(int descriptor, void* bytes, size_t size);

/// The same from `offset`; does not change the descriptor's position.
int64_t ReadSomeAt(int descriptor, void* bytes, size_t size, int64_t offset);

/// Reads exactly `size` bytes at the descriptor's position. Returns false on failure or when the
/// file ends earlier.
bool ReadExactly(int descriptor, void* bytes, size_t size);

}  // namespace vela
