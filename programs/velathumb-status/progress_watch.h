// Follows the progress of the conversion.
#pragma once

#include <iosfwd>

namespace vela {

/// Shows the progress until no velathumb and no velathumb-queue is running and the photo queue has
/// no entries that would be processed: on a terminal (`isTerminal`) as a bar that is
/// redrawn, elsewhere as a line whenever something has changed, with `asJson` as one JSON object
/// per line. Returns true when a counter has not reached its total in the end.
bool WatchProgress(std::ostream& out, bool isTerminal, bool asJson);

}  // namespace vela
