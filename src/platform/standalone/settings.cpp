#include "platform/standalone/settings.h"

#include <charconv>
#include <limits>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>

#include "platform/standalone/key_value_text.h"
#include "platform/system_rules.h"
#include "posix/file_content.h"
#include "posix/file_version.h"
#include "posix/identity.h"

namespace vela {

namespace {

/// Parses a text of decimal digits only. A number that does not fit becomes the largest one.
std::optional<uint32_t> ParseNumber(std::string_view text) {
  uint32_t number = 0;
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (stop != end || error == std::errc::invalid_argument) {
    return std::nullopt;
  }
  if (error == std::errc::result_out_of_range) {
    return std::numeric_limits<uint32_t>::max();
  }
  return number;
}

std::optional<uint32_t> FindNumber(std::string_view text, std::string_view key) {
  const auto value = FindValue(text, key);
  return value ? ParseNumber(*value) : std::nullopt;
}

void ReadSizeMap(std::string_view text, std::string_view key, int32_t& sizeMap) {
  const auto number = FindNumber(text, key);
  if (number && *number <= uint32_t{kAllThumbSizes}) {
    sizeMap = static_cast<int32_t>(*number);
  }
}

Settings ParseSettings(std::string_view text) {
  Settings settings;
  ReadSizeMap(text, "photo_thumb_size_map", settings.photoThumbSizeMap);
  ReadSizeMap(text, "video_thumb_size_map", settings.videoThumbSizeMap);
  if (const auto limit = FindNumber(text, "tool_timeout")) {
    settings.toolTimeout = std::chrono::seconds(*limit);
  }
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
