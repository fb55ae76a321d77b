// Index versions as people write them.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace vela {

/// Returns the number that the whole of `text` is in decimal digits, nothing for any other text or
/// a number beyond 2147483647.
std::optional<int32_t> ParseWholeNumber(std::string_view text);

}  // namespace vela
