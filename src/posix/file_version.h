// Whether a file is still as it was when it was read.
#pragma once

#include <sys/stat.h>

namespace vela {

/// Returns true when both records describe the same file in the same state.
bool IsSameVersion(const struct stat& a, const struct stat& b);

/// Returns true when the file has not changed for a while. Times of files advance in steps of a
/// timer tick, so a change within the same tick is not visible: only a file that has been at rest
/// can be identified by its times.
bool IsAtRest(const struct stat& file);

}  // namespace vela
