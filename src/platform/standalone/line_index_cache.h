// Line indexes of the files that were searched most recently.
#pragma once

#include <optional>
#include <string_view>

namespace vela {

/// Looks up in the index of the file `path` whether a line equals the text. Returns nothing when
/// there is no index of the file's present version. Thread-safe.
std::optional<bool> FindLineInIndex(const char* path, std::string_view text);

/// Indexes the open file `fd`, whose path is `path`, when it is large enough to be worth the memory
/// and has not changed recently. Changes the read position. Failures are ignored.
void IndexLines(const char* path, int fd);

}  // namespace vela
