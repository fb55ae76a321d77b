// Follows the progress of the running velathumb processes.
#pragma once

#include <iosfwd>

namespace vela {

/// Shows the progress until no velathumb is running: on a terminal (`isTerminal`) as a bar that is
/// redrawn, elsewhere as a line whenever something has changed, with `asJson` as one JSON object
/// per line. Returns true when a counter has not reached its total in the end.
bool WatchProgress(std::ostream& out, bool isTerminal, bool asJson);

}  // namespace vela
