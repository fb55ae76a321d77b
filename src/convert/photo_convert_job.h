// One run of the image converter for one source photo.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "convert/photo_thumb_setting.h"

namespace vela {

/// Path of the image converter.
inline constexpr char kConvertToolPath[] = "/usr/vela/bin/convert-thumb";

/// Smallest size of a thumbnail in bytes: a converter that fails early can leave a single byte.
inline constexpr int64_t kSmallestThumb = 2;

}  // namespace vela

/// All thumbnails that one converter run makes; every setting names the same source photo.
struct PhotoConvertJob {
  std::string toolPath = vela::kConvertToolPath;
  std::vector<PhotoThumbSetting> settings;
};
