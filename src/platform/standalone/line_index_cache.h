// Line indexes of the files that were searched most recently.
#pragma once

#include <optional>
#include <string_view>

namespace vela {

/// Looks up in the index of the file `path` whether a line equals the text. Returns nothing when
/// there is no index of the file's present version. Thread-safe.
std::optional<bool> FindLineInIndex(const char* path, std::string_view text);

/// Creates the index of the open file `fd`, whose path is `path`, when the file is large and at
/// rest, so that an index is worth its memory. Changes the read position. Without success there is
/// no index.
void IndexLines(const char* path, int fd);

}  // namespace vela
