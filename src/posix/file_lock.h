// Exclusive locks on files that are replaced or renamed while others wait for the lock.
#pragma once

#include <sys/stat.h>

namespace vela {

/// Waits for an exclusive lock on the open file `fd`. Returns 0 or an errno value. The lock ends
/// with the descriptor.
int LockExclusively(int fd);

/// Returns whether both records describe the same file.
bool IsSameFile(const struct stat& a, const struct stat& b);

}  // namespace vela
