// The text of key/value files: one `key="value"` a line.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace vela {

/// Returns the value of the first line of `text` that carries `key`.
std::optional<std::string> FindValue(std::string_view text, std::string_view key);

/// Returns `text` with the first line that carries `key` replaced, or with one appended; every
/// other line stays byte for byte. `key` and `value` are what IsStorable accepts.
std::string WithValue(std::string_view text, std::string_view key, std::string_view value);

/// Returns whether a line can hold the pair so that the same pair is read back.
bool IsStorable(std::string_view key, std::string_view value);

}  // namespace vela
