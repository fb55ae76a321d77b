// Lets writing fail instead of ending the process.
#pragma once

namespace vela {

/// From now on a write to a pipe that nobody reads, or beyond the largest size of a file, fails
/// with EPIPE or EFBIG, so that the run can clean up after itself.
void IgnoreWriteSignals();

/// Makes SIGPIPE and SIGXFSZ what they were before IgnoreWriteSignals, for the program that takes
/// over. Without effect when that was not called.
void RestoreWriteSignals();

}  // namespace vela
