// Waiting for the end of a child, a signal to stop, or a change of a file.
#pragma once

#include <chrono>
#include <optional>
#include <string>

#include "posix/deadline.h"
#include "posix/file_descriptor.h"

namespace vela {

/// Waits until one of the poll `events` of the descriptor `fd` occurs. Returns 0, ETIMEDOUT, or
/// another errno value.
int AwaitEvent(int fd, short events, const Deadline& deadline);

/// Waits for the events of a service that runs children. Blocks SIGCHLD, SIGTERM and SIGINT for the
/// process.
class EventWait {
 public:
  /// Watches the directory of `watchedFile` for files that are created, moved there or written.
  /// Returns 0 or an errno value.
  int Open(const std::string& watchedFile);

  /// Waits for an event, at most for `timeout` when given. Only a request to stop is remembered;
  /// the caller has to check for the other events.
  void Wait(std::optional<std::chrono::milliseconds> timeout);

  /// Returns whether a Wait has received SIGTERM or SIGINT.
  bool IsStopping() const { return isStopping_; }

  /// Returns the same also when the signal has come since the last Wait. Takes no event away from
  /// the next one, so that long work can ask in between.
  bool MustStop() const;

 private:
  void ReadSignals();
  void DiscardChanges();

  FileDescriptor signals_;
  FileDescriptor changes_;
  bool isStopping_ = false;
};

}  // namespace vela
