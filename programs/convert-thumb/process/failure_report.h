// The error message of a run that fails.
#pragma once

namespace vela {

/// Stores one line for PrintFailure, with spaces in place of control characters. Only the first
/// call of a run has an effect: later failures are most likely consequences of the first. May be
/// called by any thread.
[[gnu::format(printf, 1, 2)]] void ReportFailure(const char* format, ...);

/// Prints the program's name and the stored line, if any, to standard error. Called after all other
/// work of a failed run, because writing to standard error may block.
void PrintFailure();

}  // namespace vela
