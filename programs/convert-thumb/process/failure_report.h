// The error message of a run that fails.
#pragma once

#include <string>

namespace vela {

/// Connects to the system log, which from now on gets the failure of this run too, after the name
/// of the photo: the photo whose preview or thumbnail `source` is, if it is in a photo's folder.
/// Called before the process confines itself.
void LogFailuresOf(const std::string& source);

/// Stores one line for PrintFailure, with spaces in place of control characters. Only the first
/// call of a run has an effect: later failures are most likely consequences of the first. May be
/// called by any thread.
[[gnu::format(printf, 1, 2)]] void ReportFailure(const char* format, ...);

/// Prints the program's name and the stored line, if any, to standard error and logs it. Called
/// after all other work of a failed run, because writing to standard error may block.
void PrintFailure();

/// Logs the stored line, if any, without printing it; prints it if this run is not logged.
void LogFailure();

/// Prints the program's name and `message` to standard error and logs it, instead of the stored
/// line. May be called by a signal handler.
void PrintFailureNow(const char* message);

}  // namespace vela
