// Recorder of the sandbox's system log: everything that this process and its children send to
// /dev/log.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace vela_test {

/// One line of the system log.
struct LogMessage {
  int priority = -1;     ///< level without facility (LOG_ERR = 3), -1 when it had no header
  int facility = -1;     ///< LOG_USER and so on, -1 when it had no header
  std::string identity;  ///< who logged, with "[pid]" when the sender gave it
  std::string text;      ///< the message, byte exact, without any header
  pid_t pid = 0;         ///< process that sent it
};

/// All messages since the last clearing, in order of arrival. Complete for everything that was
/// logged by any process before the call.
std::vector<LogMessage> LogMessages();

/// The texts of all messages, each of which must be at LOG_ERR: one at another priority is returned
/// as "<priority> text", so that a comparison shows it.
std::vector<std::string> ErrorLines();

/// Discards all messages so far. ResetSandbox does it for every SandboxTest.
void ClearLog();

/// Restores /dev/log when a test has removed it. Done by EnterSandbox and ResetSandbox; the
/// recording continues without a gap, also for a syslog connection that is already open.
void StartLogRecorder();

}  // namespace vela_test
