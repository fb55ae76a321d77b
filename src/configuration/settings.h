// The settings of the machine: the keys of /etc/velainfo.conf, in one table.
#pragma once

#include <array>
#include <chrono>
#include <cstdint>
#include <string>
#include <string_view>

namespace vela {

inline constexpr char kPhotoSizeMapKey[] = "photo_thumb_size_map";
inline constexpr char kVideoSizeMapKey[] = "video_thumb_size_map";
inline constexpr char kToolTimeoutKey[] = "tool_timeout";
inline constexpr char kRawPixelLimitKey[] = "raw_pixel_limit";
inline constexpr char kWorkAsOwnerKey[] = "work_as_owner";
inline constexpr char kStallTimeoutKey[] = "stall_timeout";
inline constexpr char kConvertMemoryKey[] = "convert_memory_limit";
inline constexpr char kMobileVideoKey[] = "enable_mobile_video";
inline constexpr char kResumeTimeKey[] = "thumb_conv_resume_time";
inline constexpr char kIndexVersionKey[] = "index_version";
inline constexpr char kPhotoConvertDisabledKey[] = "disable_convert_photo";
inline constexpr char kVideoConvertDisabledKey[] = "disable_convert_video";

inline constexpr std::chrono::seconds kDefaultToolTimeout(600);
inline constexpr std::chrono::seconds kDefaultStallTimeout(900);
/// More than three times what the largest cameras record, and 3 GB in the decoder.
inline constexpr uint64_t kDefaultRawPixelLimit = 500'000'000;

/// The value of a switch that is on; any other text leaves it off.
inline constexpr char kYes[] = "yes";

/// What the value of a setting is.
enum class SettingKind {
  kSizeMap,  ///< a sum of size classes
  kSeconds,  ///< 0: no limit
  kPixels,   ///< 0: no limit
  kBytes,
  kSwitch,
  kTime,  ///< seconds since the epoch
  kIndexVersion,
};

/// A setting.
struct Setting {
  const char* key;
  SettingKind kind;
  uint64_t defaultValue;  ///< 0 for a switch that is off
};

/// All settings.
extern const std::array<Setting, 12> kSettings;

/// A key that other software on a storage server uses in the same file; no program here reads it.
inline constexpr char kForeignPauseKey[] = "thumb_conv_paused";

/// Returns the setting with this key, null when there is none.
const Setting* FindSetting(std::string_view key);

/// Returns the bytes that the converter may use for one photo when no setting says so.
uint64_t DefaultConvertMemory();

/// Returns the valid values of a setting, such as "a number from 0 to 63".
std::string ValidValues(SettingKind kind);

/// Returns the default of a setting as it would be written.
std::string DefaultText(const Setting& setting);

/// Returns whether the whole value is one of the valid ones.
bool IsValidValue(const Setting& setting, std::string_view value);

}  // namespace vela
