// Makes writes fail instead of ending the process.
#pragma once

namespace vela {

/// From now on, a write to a pipe without a reader or beyond the largest file size fails with EPIPE
/// or EFBIG instead of raising a signal, so that the run can clean up.
void IgnoreWriteSignals();

/// Restores SIGPIPE and SIGXFSZ to their state before IgnoreWriteSignals, for the program that
/// replaces this one. Has no effect without that call.
void RestoreWriteSignals();

}  // namespace vela
