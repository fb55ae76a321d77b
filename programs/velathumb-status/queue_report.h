// The contents of the creation queues.
#pragma once

#include <iosfwd>

#include "json_report.h"
#include "status_scan.h"

namespace vela {

/// Writes the entries of all queue files as text. With `checkVideos` also counts the queued videos
/// that need work, which removes bad thumbnails and converted videos. Returns true when there are
/// any entries.
bool WriteQueueText(std::ostream& out, bool checkVideos, const ScanErrorHandler& onError);

/// Writes the same as the member "queues".
bool WriteQueueJson(JsonReport& report, bool checkVideos, const ScanErrorHandler& onError);

}  // namespace vela
