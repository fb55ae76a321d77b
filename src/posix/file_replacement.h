// Creating and replacing files atomically.
#pragma once

#include <sys/stat.h>

#include <string>
#include <string_view>

namespace vela {

/// Atomically creates the file `path` with this content and mode 0644. Returns 0 or an errno value,
/// EEXIST when `path` exists.
int CreateAtomically(const std::string& path, std::string_view content);

/// Atomically replaces `path` with a new file of this content and the mode and owner of `old`. The
/// caller holds the lock on the old file. Returns 0 or an errno value.
int ReplaceAtomically(const std::string& path, std::string_view content, const struct stat& old);

}  // namespace vela
