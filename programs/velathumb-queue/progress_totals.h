// What the progress counters count towards.
#pragma once

#include <string>
#include <vector>

/// How the totals are set.
struct TotalsQuestion {
  bool beginAnew = false;    ///< counters of earlier work are set to 0
  bool countVideos = false;  ///< videos that wait too, with the removals that are part of it
};

/// Sets the totals in the progress files to what is done and what the entries still need, by the
/// status of their directories. A file that cannot be written is told in the log.
void SetProgressTotals(const std::vector<std::string>& entries, const TotalsQuestion& question);
