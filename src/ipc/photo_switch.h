// The index daemon's switch for the conversion of photos, for programs that cannot wait long.
#pragma once

#include <chrono>

namespace vela {

/// What the daemon says.
struct PhotoSwitch {
  bool isOff = false;              ///< photos must not be converted; false without a valid answer
  bool isNobodyListening = false;  ///< no daemon listens
};

/// Sends the request of IsDisableConvertPhoto and waits for the answer up to `limit`. Logs nothing.
PhotoSwitch AskPhotoSwitch(std::chrono::seconds limit);

}  // namespace vela
