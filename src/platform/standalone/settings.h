// The settings of the platform in /etc/velainfo.conf.
#pragma once

#include <chrono>
#include <cstdint>

#include "platform/system_rules.h"

namespace vela {

/// What the settings file says, with the defaults for what it does not say.
struct Settings {
  int32_t photoThumbSizeMap = kAllThumbSizes;  ///< bit mask of size classes
  int32_t videoThumbSizeMap = kAllThumbSizes;  ///< bit mask of size classes
  std::chrono::seconds toolTimeout{600};       ///< 0: no limit
};

/// Returns the settings as the file holds them now; callable from any thread.
Settings CurrentSettings();

}  // namespace vela
