// Reading files piece by piece; an interrupted system call is repeated.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace vela {

/// Reads up to `size` bytes from the present position; `got` is 0 at the end of the file. Returns 0
/// or an errno value.
int ReadChunk(int fd, char* chunk, size_t size, size_t& got);

/// Returns `size` bytes from `offset`, or as many as can be read. Leaves the position as it is.
std::string ReadAt(int fd, int64_t offset, size_t size);

/// Moves the position to the beginning. Returns 0 or an errno value, ESPIPE for a pipe.
int Rewind(int fd);

}  // namespace vela
