// What the machine's settings file says to the daemon.
#pragma once

#include <cstdint>
#include <string>

namespace vela {

/// The settings, with the defaults for what the file does not say.
struct Settings {
  int32_t indexVersion = 0;
  bool isPhotoConvertDisabled = false;
  bool isVideoConvertDisabled = false;
};

/// Reads the settings file anew. `warning`, when not empty afterwards, tells about a value or file
/// that could not be used; the default stands in for it.
Settings ReadSettings(std::string& warning);

}  // namespace vela
