// Calls in a separate process, which may give up rights or end by them.
#pragma once

#include <functional>

namespace vela_test {

/// The errno of a failed system call, 0 on success. To be called right after it.
int ErrorOf(long result);

/// The wait status of a child that calls `task` and exits with its result.
int WaitStatusOf(const std::function<int()>& task);

/// The result of `task` (0 to 255) in a child; fails the test when the child does not exit.
int InChild(const std::function<int()>& task);

}  // namespace vela_test
