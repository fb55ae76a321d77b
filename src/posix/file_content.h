// Reading and writing whole files.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace vela {

/// Appends everything from the present position of `fd` to its end to `content`. Returns 0 or an
/// errno value.
int ReadToEnd(int fd, std::string& content);

/// Reads the file `path` into `content`; never waits for a pipe's writer. Returns 0 or an errno
/// value.
int ReadFile(const char* path, std::string& content);

/// Returns the content of the regular file `path`; empty for a symbolic link, for anything else
/// than a regular file, for a file of more than `limit` bytes and after an error. Never waits for a
/// pipe's writer.
std::string ReadSmallFile(const std::string& path, size_t limit);

/// Writes all of `content` to `fd`. Returns 0 or an errno value.
int WriteAll(int fd, std::string_view content);

}  // namespace vela
