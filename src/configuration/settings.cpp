#include "configuration/settings.h"

#include <algorithm>

#include "configuration/setting_values.h"
#include "configuration/whole_number.h"
#include "platform/system_rules.h"

namespace vela {

namespace {

constexpr uint64_t kDefaultConvertMemory = VELA_CONVERT_MEMORY_LIMIT;

}  // namespace

const std::array<Setting, 12> kSettings = {{
    {kPhotoSizeMapKey, SettingKind::kSizeMap, kAllThumbSizes},
    {kVideoSizeMapKey, SettingKind::kSizeMap, kAllThumbSizes},
    {kToolTimeoutKey, SettingKind::kSeconds, uint64_t{kDefaultToolTimeout.count()}},
    {kRawPixelLimitKey, SettingKind::kPixels, kDefaultRawPixelLimit},
    {kWorkAsOwnerKey, SettingKind::kSwitch, 0},
    {kStallTimeoutKey, SettingKind::kSeconds, uint64_t{kDefaultStallTimeout.count()}},
    {kConvertMemoryKey, SettingKind::kBytes, kDefaultConvertMemory},
    {kMobileVideoKey, SettingKind::kSwitch, 0},
    {kResumeTimeKey, SettingKind::kTime, 0},
    {kIndexVersionKey, SettingKind::kIndexVersion, 0},
    {kPhotoConvertDisabledKey, SettingKind::kSwitch, 0},
    {kVideoConvertDisabledKey, SettingKind::kSwitch, 0},
}};

namespace {

/// The reader of this setting takes the integer that the text begins with; a negative one never
/// comes, which pauses the conversion without an end.
bool IsTime(std::string_view value) {
  const bool isNegative = !value.empty() && value.front() == '-';
  return ParseWholeNumber<int64_t>(value.substr(isNegative ? 1 : 0)).has_value();
}

}  // namespace

const Setting* FindSetting(std::string_view key) {
  const auto found = std::find_if(kSettings.begin(), kSettings.end(),
                                  [key](const Setting& setting) { return setting.key == key; });
  return found == kSettings.end() ? nullptr : &*found;
}

uint64_t DefaultConvertMemory() {
  return kDefaultConvertMemory;
}

std::string ValidValues(SettingKind kind) {
  switch (kind) {
    case SettingKind::kSizeMap:
      return "a number from 0 to " + std::to_string(kAllThumbSizes);
    case SettingKind::kSeconds:
      return "a number of seconds, or 0 for no limit";
    case SettingKind::kPixels:
      return "a number of pixels, or 0 for no limit";
    case SettingKind::kBytes:
      return "a number of bytes from 1, such as 536870912 or 512M";
    case SettingKind::kSwitch:
      return "yes or no";
    case SettingKind::kTime:
      return "a number of seconds since the epoch";
    case SettingKind::kIndexVersion:
      return "a number from 0 to 2147483647";
  }
  return {};
}

std::string DefaultText(const Setting& setting) {
  return setting.kind == SettingKind::kSwitch ? "no" : std::to_string(setting.defaultValue);
}

bool IsValidValue(const Setting& setting, std::string_view value) {
  switch (setting.kind) {
    case SettingKind::kSizeMap:
      return ParseSizeMap(value).has_value();
    case SettingKind::kSeconds:
      return ParseSeconds(value).has_value();
    case SettingKind::kPixels:
      return ParseWholeNumber<uint64_t>(value).has_value();
    case SettingKind::kBytes:
      return value.empty() || ParseByteCount(value);
    case SettingKind::kSwitch:
      return value == kYes || value == "no";
    case SettingKind::kTime:
      return value.empty() || IsTime(value);
    case SettingKind::kIndexVersion:
      return ParseWholeNumber(value).has_value();
  }
  return false;
}

}  // namespace vela
