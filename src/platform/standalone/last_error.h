// The error of the calling thread's last platform failure.
#pragma once

namespace vela {

/// Keeps `code` (an errno value) and the caller's place in the source as the calling thread's last
/// failure. Leaves errno as it is.
void SetLastError(int code, const char* file = __builtin_FILE(), int line = __builtin_LINE());

/// The same for functions that report a failure by -1, which it returns.
int Fail(int code, const char* file = __builtin_FILE(), int line = __builtin_LINE());

}  // namespace vela
