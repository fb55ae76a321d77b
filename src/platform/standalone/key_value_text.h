// The text of key/value files: one `key="value"` per line.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace vela {

/// Returns the value in the first line of `text` that has `key`.
std::optional<std::string> FindValue(std::string_view text, std::string_view key);

/// Returns `text` with the first line that has `key` replaced, or with a line appended; all other
/// lines stay byte for byte. IsStorable must accept the pair.
std::string WithValue(std::string_view text, std::string_view key, std::string_view value);

/// Returns whether the pair can be written as a line that is read back as the same pair.
bool IsStorable(std::string_view key, std::string_view value);

}  // namespace vela
