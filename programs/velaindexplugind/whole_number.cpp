#include "whole_number.h"

#include <charconv>

namespace vela {

std::optional<int32_t> ParseWholeNumber(std::string_view text) {
  if (text.empty() || text.front() == '-') return std::nullopt;
  int32_t number = 0;
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (error != std::errc() || stop != end) return std::nullopt;
  return number;
}

}  // namespace vela
