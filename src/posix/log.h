// Messages to the system log at error priority.
#pragma once

#include <string>
#include <string_view>

#include "posix/file_descriptor.h"

namespace vela {

/// The priority of all messages, as the system log numbers them.
inline constexpr int kErrorPriority = 3;

/// Logs "SOURCE:LINE TEXT". `line` identifies the message to readers of the log and does not
/// change when the code moves.
void LogError(std::string_view source, int line, std::string_view text);

/// Logs a message that does not start with its source and number.
void LogError(std::string_view text);

/// Returns `text` for use in a message, "(null)" for a null pointer.
std::string LogText(const char* text);

/// Returns an error code of the platform as messages show it, such as "0x0002".
std::string LogCode(int code);

/// A connection to the system log of a process that cannot make one later, because it confines
/// itself.
class LogConnection {
 public:
  /// Connects. When no log can be reached, later messages are silently discarded.
  LogConnection();

  /// Sends "IDENTITY: TEXT" at error priority; `line` is that text, without control characters.
  /// Waits two seconds at most. May be called by a signal handler.
  void SendError(std::string_view line) const;

 private:
  FileDescriptor socket_;
};

}  // namespace vela
