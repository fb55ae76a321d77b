#include "platform/standalone/settings.h"

#include <mutex>
#include <optional>
#include <string>
#include <string_view>

#include "configuration/key_value_text.h"
#include "configuration/setting_values.h"
#include "configuration/settings.h"
#include "platform/system_rules.h"
#include "posix/file_content.h"
#include "posix/file_version.h"
#include "posix/identity.h"

namespace vela {

namespace {

void ReadSizeMap(std::string_view text, const char* key, int32_t& sizeMap) {
  const auto value = FindValue(text, key);
  sizeMap = (value ? ParseSizeMap(*value) : std::nullopt).value_or(sizeMap);
}

Settings ParseSettings(std::string_view text) {
  Settings settings;
  ReadSizeMap(text, kPhotoSizeMapKey, settings.photoThumbSizeMap);
  ReadSizeMap(text, kVideoSizeMapKey, settings.videoThumbSizeMap);
  const auto limit = FindValue(text, kToolTimeoutKey);
  settings.toolTimeout =
      (limit ? ParseSeconds(*limit) : std::nullopt).value_or(settings.toolTimeout);
  return settings;
}

/// The settings and the version of the file they were read from, so that one stat call shows
/// whether they are still valid.
class SettingsCache {
 public:
  Settings Get();

 private:
  std::mutex mutex_;
  bool isValid_ = false;
  FileVersion version_;
  Settings settings_;
};

Settings SettingsCache::Get() {
  FileVersion now;
  if (now.Read(kSettingsFile) != 0) {
    return Settings();
  }
  const std::lock_guard<std::mutex> lock(mutex_);
  if (isValid_ && now == version_) {
    return settings_;
  }

  // The version is read before the text, so that a change in between is noticed next time.
  const bool isAtRest = now.IsAtRest();
  std::string text;
  const OwnIdentity own;
  if (ReadFile(kSettingsFile, text) != 0) {
    return Settings();
  }
  settings_ = ParseSettings(text);
  version_ = now;
  isValid_ = isAtRest;
  return settings_;
}

}  // namespace

Settings CurrentSettings() {
  static SettingsCache cache;
  return cache.Get();
}

}  // namespace vela
