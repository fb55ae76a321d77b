// Follows the running instances.
#pragma once

#include <iosfwd>

namespace vela {

/// Shows the progress until no velathumb is running: on a terminal (`isTerminal`) as a bar that is
/// drawn anew, elsewhere as a line whenever something has changed, with `asJson` as a JSON object a
/// line. Returns true when a counter has not reached its total in the end.
bool WatchProgress(std::ostream& out, bool isTerminal, bool asJson);

}  // namespace vela
