// What the creation queues hold.
#pragma once

#include <iosfwd>

#include "json_report.h"
#include "status_scan.h"

namespace vela {

/// How a report of the queues is asked for.
struct QueueQuestion {
  bool countVideoWork = false;  ///< with the removals that are part of it
};

/// Writes the entries of all queue files as text. Returns true when there are any.
bool WriteQueueText(std::ostream& out, const QueueQuestion& question,
                    const ScanErrorHandler& onError);

/// Writes the same as the member "queues".
bool WriteQueueJson(JsonReport& report, const QueueQuestion& question,
                    const ScanErrorHandler& onError);

}  // namespace vela
