// Follows the progress of the conversion.
#pragma once

#include <chrono>
#include <iosfwd>

namespace vela {

/// How long a queue that nothing processes is watched: one that is left over, for instance by a
/// velathumb that was started by hand, may stay for ever.
inline constexpr std::chrono::milliseconds kUnattendedLimit = std::chrono::seconds(60);

/// Shows the progress until no velathumb and no velathumb-queue is running and the photo queue has
/// no entries that would be processed: on a terminal (`isTerminal`) as a bar that is
/// redrawn, elsewhere as a line whenever something has changed, with `asJson` as one JSON object
/// per line. Also ends, and says so, when nothing has processed the entries of the queue for
/// `unattendedLimit`. Returns true when work is left: in the end a counter has not reached its
/// total, or nothing processes the queue.
bool WatchProgress(std::ostream& out, bool isTerminal, bool asJson,
                   std::chrono::milliseconds unattendedLimit = kUnattendedLimit);

}  // namespace vela
