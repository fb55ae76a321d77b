#include "configuration/setting_values.h"

#include <charconv>
#include <limits>
#include <system_error>

#include "configuration/whole_number.h"
#include "platform/system_rules.h"

namespace vela {

namespace {

/// Returns how often the suffix of a number doubles it; empty for an unknown suffix.
std::optional<int> Doublings(std::string_view unit) {
  constexpr std::string_view kUnits = "kmg";
  constexpr int kDoublingsEach = 10;
  if (unit.empty()) {
    return 0;
  }
  const size_t index = kUnits.find(static_cast<char>(unit.front() | 0x20));
  if (unit.size() > 1 || index == std::string_view::npos) {
    return std::nullopt;
  }
  return kDoublingsEach * static_cast<int>(index + 1);
}

}  // namespace

std::optional<int32_t> ParseSizeMap(std::string_view text) {
  const std::optional<int32_t> number = ParseWholeNumber(text);
  return number && *number <= kAllThumbSizes ? number : std::nullopt;
}

std::optional<std::chrono::seconds> ParseSeconds(std::string_view text) {
  uint32_t number = 0;
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (stop != end || error == std::errc::invalid_argument) {
    return std::nullopt;
  }
  const bool isTooLarge = error == std::errc::result_out_of_range;
  return std::chrono::seconds(isTooLarge ? std::numeric_limits<uint32_t>::max() : number);
}

std::optional<size_t> ParseByteCount(std::string_view text) {
  const char* const last = text.data() + text.size();
  size_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), last, number);
  if (error != std::errc() || number == 0) {
    return std::nullopt;
  }
  const std::optional<int> doublings =
      Doublings(std::string_view(end, static_cast<size_t>(last - end)));
  if (!doublings || number > std::numeric_limits<size_t>::max() >> *doublings) {
    return std::nullopt;
  }
  return number << *doublings;
}

}  // namespace vela
