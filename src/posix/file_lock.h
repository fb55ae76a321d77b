// Exclusive locks on files that are replaced or renamed while others wait for the lock.
#pragma once

#include <sys/stat.h>

namespace vela {

/// Waits for an exclusive lock on the open file `fd`. Returns 0 or an errno value. The lock ends
/// with the descriptor.
int LockExclusively(int fd);

/// Takes an exclusive lock on the open file `fd` without waiting. Returns 0 or an errno value,
/// EWOULDBLOCK while another process holds a lock. The lock ends with the descriptor.
int TryLockExclusively(int fd);

/// Releases the lock on the open file `fd`, also for processes that share the descriptor.
void Unlock(int fd);

/// Returns true when both records describe the same file.
bool IsSameFile(const struct stat& a, const struct stat& b);

}  // namespace vela
