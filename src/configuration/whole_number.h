// Numbers as text.
#pragma once

#include <charconv>
#include <cstdint>
#include <optional>
#include <string_view>
#include <system_error>

namespace vela {

/// Parses a text that consists of decimal digits only. Returns nothing for any other text and for
/// numbers that do not fit.
template <typename Number = int32_t>
std::optional<Number> ParseWholeNumber(std::string_view text) {
  if (text.empty() || text.front() == '-') {
    return std::nullopt;
  }
  Number number = 0;
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (error != std::errc() || stop != end) {
    return std::nullopt;
  }
  return number;
}

}  // namespace vela
