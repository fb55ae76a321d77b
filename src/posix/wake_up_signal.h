// Waking up a thread that waits for events of descriptors.
#pragma once

#include "posix/file_descriptor.h"

namespace vela {

/// A signal from other threads. It stays set until it is cleared.
class WakeUpSignal {
 public:
  /// Returns 0 or an errno value.
  int Open();

  /// The descriptor is readable while the signal is set.
  int Fd() const { return signal_.Get(); }

  void Set() const;
  void Clear() const;

 private:
  FileDescriptor signal_;
};

}  // namespace vela
