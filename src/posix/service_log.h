// The log of the services and companion programs: lines on standard error.
#pragma once

#include <string_view>

namespace vela {

/// Levels as the system log numbers them.
enum class LogLevel { kError = 3, kWarning = 4, kInfo = 6 };

/// Returns whether standard error is connected to the systemd journal; determined at the first
/// call.
bool IsLogInJournal();

/// Writes `message` as one line to standard error, with control characters and bytes that are not
/// valid UTF-8 escaped. In the journal the line begins with the level as `<3>`, elsewhere with the
/// name of the program. A failure to write is ignored.
void WriteLog(LogLevel level, std::string_view message);

/// The same, with the text of the errno value `error` appended.
void WriteLog(LogLevel level, std::string_view message, int error);

/// Shows `line`, which must fit into a line of the terminal, below all messages on standard error,
/// in place of the one shown before; an empty line removes it. Does nothing unless standard error
/// is a terminal. Only for programs with one thread.
void ShowStatusLine(std::string_view line);

}  // namespace vela
