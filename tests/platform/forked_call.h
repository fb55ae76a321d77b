// Runs a call in a process of its own.
#pragma once

#include <sys/types.h>

#include <functional>

namespace platform_test {

/// Starts a copy of this process that makes the call and ends with its result (0 to 255) as exit
/// status. The call runs without any of the test's own threads.
pid_t Fork(const std::function<int()>& call);

/// Waits for a process of Fork. Returns its exit status, or minus the signal that ended it.
int Join(pid_t pid);

/// Both.
int RunForked(const std::function<int()>& call);

/// Returns how many ended children of this process nobody has waited for.
int CountZombies();

/// Returns how many descriptors this process has open.
int CountDescriptors();

}  // namespace platform_test
