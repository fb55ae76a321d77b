// What the runner tells on standard error.
#pragma once

#include <string>

namespace vela {

enum class LogLevel { kError, kWarning, kInfo };

/// Writes a line to standard error, control characters escaped; under the system's journal with the
/// level in front.
void WriteLog(LogLevel level, const std::string& message);

/// Returns the text of an errno value.
std::string ErrnoText(int error);

}  // namespace vela
