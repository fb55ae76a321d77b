// The daemon's settings in the system's settings file.
#pragma once

#include <cstdint>

namespace vela {

/// The settings, with defaults for those that the file does not contain.
struct Settings {
  int32_t indexVersion = 0;
  bool isPhotoConvertDisabled = false;
  bool isVideoConvertDisabled = false;
};

/// Reads the settings file.
Settings ReadSettings();

}  // namespace vela
