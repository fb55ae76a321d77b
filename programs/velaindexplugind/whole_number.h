// Numbers from 0 to 2147483647 as text.
#pragma once

#include <charconv>
#include <cstdint>
#include <optional>
#include <string_view>

namespace vela {

/// Parses a text that consists of decimal digits only. Returns nothing for any other text and for
/// larger numbers.
inline std::optional<int32_t> ParseWholeNumber(std::string_view text) {
  if (text.empty() || text.front() == '-') {
    return std::nullopt;
  }
  int32_t number = 0;
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (error != std::errc() || stop != end) {
    return std::nullopt;
  }
  return number;
}

}  // namespace vela
