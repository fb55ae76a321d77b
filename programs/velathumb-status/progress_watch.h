// Follows the progress of the conversion.
#pragma once

#include <chrono>
#include <iosfwd>

namespace vela {

/// How long a standstill lasts until something is concluded from it.
struct WatchLimits {
  /// A queue that nothing processes is no longer watched: one that is left over, for instance by a
  /// velathumb that was started by hand, may stay for ever.
  std::chrono::milliseconds unattended = std::chrono::seconds(60);
  /// A velathumb-queue without a velathumb is idle.
  std::chrono::milliseconds idle = std::chrono::seconds(3);
};

/// Shows the progress until no velathumb and no velathumb-queue is running and the photo queue has
/// no entries that would be processed: on a terminal (`isTerminal`) as a bar that is
/// redrawn, elsewhere as a line whenever something has changed, with `asJson` as one JSON object
/// per line. Also ends, and says so, when nothing has processed the entries of the queue for a
/// while. Returns true when work is left: in the end a counter has not reached its total, entries
/// are deferred, or nothing processes the queue.
bool WatchProgress(std::ostream& out, bool isTerminal, bool asJson,
                   const WatchLimits& limits = WatchLimits());

}  // namespace vela
