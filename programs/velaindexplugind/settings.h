// The daemon's settings in the system's settings file.
#pragma once

#include <cstdint>
#include <string>

namespace vela {

/// The settings, with defaults for those that the file does not contain.
struct Settings {
  int32_t indexVersion = 0;
  bool isPhotoConvertDisabled = false;
  bool isVideoConvertDisabled = false;
};

/// Reads the settings file. `warning` receives the reason why a default is used instead of a value
/// or of the file, empty when there is none.
Settings ReadSettings(std::string& warning);

}  // namespace vela
