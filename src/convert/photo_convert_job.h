// One run of the image converter for one source photo.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "convert/photo_thumb_setting.h"

namespace vela {

/// Path of the image converter.
inline constexpr char kConvertToolPath[] = "/usr/vela/bin/convert-thumb";

/// Bytes that a thumbnail has at least: a converter that fails early can leave a single one.
inline constexpr int64_t kSmallestThumb = 2;

}  // namespace vela

/// All thumbnails that one converter run makes; every setting names the same source photo.
struct PhotoConvertJob {
  std::string toolPath = vela::kConvertToolPath;
  std::vector<PhotoThumbSetting> settings;
};
