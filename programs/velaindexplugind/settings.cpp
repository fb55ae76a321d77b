#include "settings.h"

#include <array>
#include <cerrno>
#include <cstring>
#include <optional>

#include "platform/system_rules.h"
#include "platform/vlibc.h"
#include "whole_number.h"

namespace vela {

namespace {

/// Long enough for all valid values; a longer one is cut, which leaves it invalid.
using Value = std::array<char, 64>;

/// Returns whether the file has the key. A missing file causes no warning.
bool FindValue(const char* key, Value& value, std::string& warning) {
  const int found = VLIBCFileGetKeyValue(kSettingsFile, key, value.data(), value.size(), 0);
  if (found < 0 && VLIBCErrGet() != ENOENT) {
    warning = std::string(kSettingsFile) + ": " + std::strerror(VLIBCErrGet());
  }
  return found > 0;
}

bool IsYes(const char* key, std::string& warning) {
  Value value;
  return FindValue(key, value, warning) && std::strcmp(value.data(), "yes") == 0;
}

int32_t ReadIndexVersion(std::string& warning) {
  Value value;
  if (!FindValue("index_version", value, warning)) {
    return 0;
  }
  const std::optional<int32_t> number = ParseWholeNumber(value.data());
  if (!number) {
    warning = "index_version is not a number from 0 to 2147483647; using 0";
  }
  return number.value_or(0);
}

}  // namespace

Settings ReadSettings(std::string& warning) {
  warning.clear();
  Settings settings;
  settings.indexVersion = ReadIndexVersion(warning);
  settings.isPhotoConvertDisabled = IsYes("disable_convert_photo", warning);
  settings.isVideoConvertDisabled = IsYes("disable_convert_video", warning);
  return settings;
}

}  // namespace vela
