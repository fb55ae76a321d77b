// One run of the image converter for one source photo.
#pragma once

#include <string>
#include <vector>

#include "convert/photo_thumb_setting.h"

/// Path of the image converter.
inline constexpr char kConvertToolPath[] = "/usr/vela/bin/convert-thumb";

/// All thumbnails that one converter run makes; every setting names the same source photo.
struct PhotoConvertJob {
  std::string toolPath = kConvertToolPath;
  std::vector<PhotoThumbSetting> settings;
};
