// Replacing the content of a file in one step.
#pragma once

#include <sys/stat.h>

#include <string>
#include <string_view>

namespace vela {

/// Creates the file `path` with this content and mode 0644 in one step. Returns 0 or an errno
/// value, EEXIST when `path` exists.
int CreateWhole(const std::string& path, std::string_view content);

/// Puts a new file with this content in the place of `path`; mode and owner are those of `old`. The
/// caller holds the lock on the old file. Returns 0 or an errno value.
int ReplaceWhole(const std::string& path, std::string_view content, const struct stat& old);

}  // namespace vela
