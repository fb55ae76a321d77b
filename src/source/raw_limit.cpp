#include "source/raw_limit.h"

#include <cstdint>

#include "configuration/settings.h"
#include "configuration/whole_number.h"
#include "header/header_reader.h"
#include "platform/system_rules.h"
#include "platform/vlibc.h"

namespace vela {

namespace {

/// Returns the limit in pixels, 0 for none.
uint64_t RawPixelLimit() {
  char text[32] = "";
  if (VLIBCFileGetKeyValue(kSettingsFile, kRawPixelLimitKey, text, sizeof text, 0) <= 0) {
    return kDefaultRawPixelLimit;
  }
  return ParseWholeNumber<uint64_t>(text).value_or(kDefaultRawPixelLimit);
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
