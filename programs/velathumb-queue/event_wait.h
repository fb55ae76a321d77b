// Waiting for the end of a child, a signal to stop, or a new queue.
#pragma once

#include <chrono>
#include <optional>
#include <string>

#include "posix/file_descriptor.h"

namespace vela {

/// Gathers what wakes the runner. Blocks SIGCHLD, SIGTERM and SIGINT for the process.
class EventWait {
 public:
  /// Watches the directory of the file `watchedFile` for its appearing or being written. Returns 0
  /// or an errno value.
  int Open(const std::string& watchedFile);

  /// Waits until something happens or `timeout` is over; without one as long as it takes. What
  /// happened stays to be asked for elsewhere, only the wish to stop is kept.
  void Wait(std::optional<std::chrono::milliseconds> timeout);

  /// Whether SIGTERM or SIGINT has come.
  bool IsStopping() const { return isStopping_; }

 private:
  void ReadSignals();
  void DiscardChanges();

  FileDescriptor signals_;
  FileDescriptor changes_;
  bool isStopping_ = false;
};

}  // namespace vela
