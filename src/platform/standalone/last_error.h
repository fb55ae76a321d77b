// The error of the calling thread's last platform failure.
#pragma once

namespace vela {

/// Stores `code` (an errno value) and the caller's position in the source as the calling thread's
/// last failure. Preserves errno.
void SetLastError(int code, const char* file = __builtin_FILE(), int line = __builtin_LINE());

/// The same for functions that return -1 on failure: returns -1.
int Fail(int code, const char* file = __builtin_FILE(), int line = __builtin_LINE());

}  // namespace vela
