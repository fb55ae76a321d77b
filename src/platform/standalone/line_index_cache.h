// The indexes of the files that were searched last.
#pragma once

#include <optional>
#include <string_view>

namespace vela {

/// Tells from the index of the file `path` whether a line of it equals the text. Returns nothing
/// when there is no index of the file's present version. Callable from any thread.
std::optional<bool> FindLineInIndex(const char* path, std::string_view text);

/// Makes the index of the open file `fd`, found at `path`, when it is large and at rest: reading it
/// is then worth remembering. Moves the read position; a failure leaves no index.
void IndexLines(const char* path, int fd);

}  // namespace vela
