// The settings in /etc/velainfo.conf that concern the platform.
#pragma once

#include <chrono>
#include <cstdint>

#include "configuration/settings.h"
#include "platform/system_rules.h"

namespace vela {

/// The settings, with defaults for those that the file does not contain.
struct Settings {
  int32_t photoThumbSizeMap = kAllThumbSizes;              ///< bit mask of size classes
  int32_t videoThumbSizeMap = kAllThumbSizes;              ///< bit mask of size classes
  std::chrono::seconds toolTimeout = kDefaultToolTimeout;  ///< 0: no limit
};

/// Returns the settings that the file contains now. Thread-safe.
Settings CurrentSettings();

}  // namespace vela
