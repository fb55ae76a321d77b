#include "confinement/memory_limit.h"

#include <charconv>
#include <cstdio>
#include <limits>
#include <optional>
#include <string_view>
#include <system_error>

#include "platform/vlibc.h"

namespace vela {

namespace {

constexpr char kSystemSettings[] = "/etc/velainfo.conf";
constexpr char kKey[] = "convert_memory_limit";
constexpr size_t kDefaultLimit = CONVERT_THUMB_MEMORY_LIMIT;

/// How often a number is doubled by what stands behind it; empty for what means nothing.
std::optional<int> Doublings(std::string_view unit) {
  constexpr std::string_view kUnits = "kmg";
  constexpr int kDoublingsEach = 10;
  if (unit.empty()) {
    return 0;
  }
  const size_t place = kUnits.find(static_cast<char>(unit.front() | 0x20));
  if (unit.size() > 1 || place == std::string_view::npos) {
    return std::nullopt;
  }
  return kDoublingsEach * static_cast<int>(place + 1);
}

/// Empty for what is no size of 1 byte or more.
std::optional<size_t> ParseSize(std::string_view text) {
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

}  // namespace

size_t ConversionMemoryLimit() {
  char text[64] = "";
  if (VLIBCFileGetKeyValue(kSystemSettings, kKey, text, sizeof text, 0) <= 0 || *text == '\0') {
    return kDefaultLimit;
  }
  const std::optional<size_t> limit = ParseSize(text);
  if (!limit) {
    std::fprintf(stderr, "convert-thumb: %s: %s is no number of bytes, %zu is taken\n",
                 kSystemSettings, kKey, kDefaultLimit);
  }
  return limit.value_or(kDefaultLimit);
}

}  // namespace vela
