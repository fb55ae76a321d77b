#include "source/raw_limit.h"

#include <charconv>
#include <cstdint>
#include <cstring>
#include <system_error>

#include "header/header_reader.h"
#include "platform/system_rules.h"
#include "platform/vlibc.h"

namespace vela {

namespace {

constexpr char kLimitKey[] = "raw_pixel_limit";

/// More than three times what the largest cameras record, and 3 GB in the decoder.
constexpr uint64_t kDefaultLimit = 500'000'000;

/// Returns the limit in pixels, 0 for none.
uint64_t RawPixelLimit() {
  char text[32] = "";
  if (VLIBCFileGetKeyValue(kSettingsFile, kLimitKey, text, sizeof text, 0) <= 0) {
    return kDefaultLimit;
  }
  const char* const end = text + std::strlen(text);
  uint64_t limit = 0;
  const auto [last, error] = std::from_chars(text, end, limit);
  return error == std::errc() && last == end ? limit : kDefaultLimit;
}

}  // namespace

bool IsWithinRawLimit(const std::string& rawPath) {
  uint32_t width = 0;
  uint32_t height = 0;
  if (ReadImageSize(rawPath.c_str(), width, height) != 0) {
    return true;
  }
  const uint64_t limit = RawPixelLimit();
  return limit == 0 || uint64_t{width} * height <= limit;
}

}  // namespace vela
