// Reading and writing whole files.
#pragma once

#include <string>
#include <string_view>

namespace vela {

/// Appends everything from the present position of `fd` to its end to `content`. Returns 0 or an
/// errno value.
int ReadToEnd(int fd, std::string& content);

/// Reads the file `path` into `content`; never waits for a pipe's writer. Returns 0 or an errno
/// value.
int ReadFile(const char* path, std::string& content);

/// Writes all of `content` to `fd`. Returns 0 or an errno value.
int WriteAll(int fd, std::string_view content);

}  // namespace vela
