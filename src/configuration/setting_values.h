// Parses the values of settings.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

namespace vela {

/// Parses a sum of size classes, a number from 0 to 63. Returns nothing for any other text.
std::optional<int32_t> ParseSizeMap(std::string_view text);

/// Parses a whole number of seconds; one above 4294967295 becomes that. Returns nothing for any
/// other text.
std::optional<std::chrono::seconds> ParseSeconds(std::string_view text);

/// Parses a number of bytes from 1, with or without one of the suffixes K, M and G in either case.
/// Returns nothing for any other text and for a number that does not fit.
std::optional<size_t> ParseByteCount(std::string_view text);

}  // namespace vela
