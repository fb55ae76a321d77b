#include "posix/service_log.h"

#include <errno.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "posix/escaped_text.h"
#include "posix/file_content.h"
#include "posix/terminal.h"

namespace vela {

namespace {

/// The variable alone proves nothing: it is inherited by programs whose standard error was
/// redirected.
bool IsConnectedToJournal() {
  const char* stream = std::getenv("JOURNAL_STREAM");
  struct stat status;
  if (stream == nullptr || fstat(STDERR_FILENO, &status) != 0) {
    return false;
  }
  return stream == std::to_string(status.st_dev) + ':' + std::to_string(status.st_ino);
}

/// Begins a line in place of the last one.
constexpr char kEraseLine[] = "\r\033[K";

/// What ShowStatusLine has shown.
std::string& StatusLine() {
  static std::string line;
  return line;
}

std::string Prefix(LogLevel level) {
  if (IsLogInJournal()) {
    return '<' + std::to_string(static_cast<int>(level)) + '>';
  }
  return std::string(program_invocation_short_name) + ": ";
}

}  // namespace

bool IsLogInJournal() {
  static const bool isInJournal = IsConnectedToJournal();
  return isInJournal;
}

void WriteLog(LogLevel level, std::string_view message) {
  const std::string line = Prefix(level) + EscapeControls(message, InvalidBytes::kEscape) + '\n';
  // Usually a single write, so that lines of several threads and processes do not mix.
  const std::string& status = StatusLine();
  WriteAll(STDERR_FILENO, status.empty() ? line : kEraseLine + line + status);
}

void WriteLog(LogLevel level, std::string_view message, int error) {
  WriteLog(level, std::string(message) + ": " + std::strerror(error));
}

void ShowStatusLine(std::string_view line) {
  if (line == StatusLine() || !IsErrorTerminal()) {
    return;
  }
  StatusLine() = line;
  WriteAll(STDERR_FILENO, kEraseLine + StatusLine());
}

}  // namespace vela
