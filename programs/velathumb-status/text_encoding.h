// Encodes byte strings for the formats of the reports.
#pragma once

#include <string>
#include <string_view>

namespace vela {

/// Returns the text as valid UTF-8: every invalid byte becomes the replacement character.
std::string ToUtf8(std::string_view bytes);

/// Returns whether the bytes are valid UTF-8.
bool IsUtf8(std::string_view bytes);

/// Returns the text for an HTML page, in an attribute or between tags: valid UTF-8, with markup and
/// control characters escaped.
std::string ToHtml(std::string_view bytes);

/// Returns the bytes in base 64, on one line.
std::string ToBase64(std::string_view bytes);

/// Returns the text for a line on a terminal or in a file: control characters and the backslash
/// escaped, everything else as it is.
std::string ToPlainLine(std::string_view bytes);

}  // namespace vela
