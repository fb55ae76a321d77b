// White space in the text formats of the configuration, whatever the locale.
#pragma once

#include <string_view>

namespace vela {

constexpr bool IsWhiteSpace(char c) {
  return c == ' ' || (c >= '\t' && c <= '\r');
}

/// Returns `text` without the white space at its ends.
constexpr std::string_view Trimmed(std::string_view text) {
  while (!text.empty() && IsWhiteSpace(text.front())) {
    text.remove_prefix(1);
  }
  while (!text.empty() && IsWhiteSpace(text.back())) {
    text.remove_suffix(1);
  }
  return text;
}

}  // namespace vela
