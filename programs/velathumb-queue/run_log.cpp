#include "run_log.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace vela {

namespace {

const char* JournalPrefix(LogLevel level) {
  switch (level) {
    case LogLevel::kError:
      return "<3>";
    case LogLevel::kWarning:
      return "<4>";
    case LogLevel::kInfo:
      return "<6>";
  }
  return "";
}

/// Tells whether standard error leads to the journal, and not only that of a program above.
bool IsJournal() {
  const char* stream = std::getenv("JOURNAL_STREAM");
  struct stat status = {};
  return stream != nullptr && fstat(STDERR_FILENO, &status) == 0 &&
         std::to_string(status.st_dev) + ':' + std::to_string(status.st_ino) == stream;
}

std::string EscapeControls(const std::string& text) {
  std::string line;
  for (const char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    if (byte >= 0x20 && byte != 0x7f) {
      line += c;
      continue;
    }
    char escape[8] = "";
    std::snprintf(escape, sizeof escape, "\\x%02x", static_cast<unsigned>(byte));
    line += escape;
  }
  return line;
}

}  // namespace

void WriteLog(LogLevel level, const std::string& message) {
  static const bool isJournal = IsJournal();
  const std::string line = (isJournal ? JournalPrefix(level) : std::string("velathumb-queue: ")) +
                           EscapeControls(message) + '\n';
  // In one piece, so that lines of several processes do not mix; nobody to tell when it fails.
  [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, line.data(), line.size());
}

std::string ErrnoText(int error) {
  return std::strerror(error);
}

}  // namespace vela
