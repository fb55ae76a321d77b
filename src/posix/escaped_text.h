// Untrusted text, made safe for a terminal or a log line.
#pragma once

#include <string>
#include <string_view>

namespace vela {

/// How bytes that are not valid UTF-8 are handled. Those from 0x80 to 0x9f are always escaped: some
/// terminals take them for control characters.
enum class InvalidBytes { kKeep, kEscape };

/// Returns the text with its control characters escaped: `\n` for a newline, `\x1b` and the like
/// for the others, including the characters from U+0080 to U+009F, line and paragraph separators,
/// marks that change the direction of text, and characters without a width, such as a byte order
/// mark. Backslashes are kept.
std::string EscapeControls(std::string_view text, InvalidBytes invalidBytes);

}  // namespace vela
