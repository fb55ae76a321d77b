#include "settings.h"

#include <array>
#include <cstring>

#include "configuration/settings.h"
#include "configuration/whole_number.h"
#include "platform/system_rules.h"
#include "platform/vlibc.h"

namespace vela {

namespace {

/// Long enough for all valid values; a longer one is cut, which leaves it invalid.
using Value = std::array<char, 64>;

/// Returns the value of the key, an empty one when the file or the key is missing.
Value ReadValue(const char* key) {
  Value value = {};
  VLIBCFileGetKeyValue(kSettingsFile, key, value.data(), value.size(), 0);
  return value;
}

bool IsYes(const char* key) {
  return std::strcmp(ReadValue(key).data(), kYes) == 0;
}

}  // namespace

Settings ReadSettings() {
  Settings settings;
  settings.indexVersion = ParseWholeNumber(ReadValue(kIndexVersionKey).data()).value_or(0);
  settings.isPhotoConvertDisabled = IsYes(kPhotoConvertDisabledKey);
  settings.isVideoConvertDisabled = IsYes(kVideoConvertDisabledKey);
  return settings;
}

}  // namespace vela
