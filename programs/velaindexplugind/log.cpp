#include "log.h"

#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <ctime>

namespace vela {

namespace {

const char* NameOf(LogLevel level) {
  switch (level) {
    case LogLevel::kError:
      return "error";
    case LogLevel::kWarning:
      return "warning";
    case LogLevel::kInfo:
      break;
  }
  return "info";
}

bool IsPlain(char c) {
  return c > ' ' && c <= '~' && c != '"' && c != '=' && c != '\\';
}

bool IsPlain(std::string_view value) {
  for (const char c : value) {
    if (!IsPlain(c)) return false;
  }
  return !value.empty();
}

/// Bytes that are no printable ASCII are escaped: a name must not be able to forge a line.
void AppendEscaped(std::string& text, char c) {
  if (c == '"' || c == '\\') {
    text += '\\';
    text += c;
  } else if (c == '\n') {
    text += "\\n";
  } else if (c >= ' ' && c <= '~') {
    text += c;
  } else {
    constexpr char kDigits[] = "0123456789abcdef";
    const auto byte = static_cast<unsigned char>(c);
    text += "\\x";
    text += kDigits[byte / 16];
    text += kDigits[byte % 16];
  }
}

std::string TimeNow() {
  timespec now{};
  clock_gettime(CLOCK_REALTIME, &now);
  tm parts{};
  gmtime_r(&now.tv_sec, &parts);
  std::array<char, 80> text{};
  std::snprintf(text.data(), text.size(), "%04d-%02d-%02dT%02d:%02d:%02d.%03ldZ",
                parts.tm_year + 1900, parts.tm_mon + 1, parts.tm_mday, parts.tm_hour, parts.tm_min,
                parts.tm_sec, now.tv_nsec / 1000000);
  return text.data();
}

/// The variable is inherited by programs whose standard error leads elsewhere, too.
bool IsJournal() {
  static const bool isJournal = [] {
    const char* stream = std::getenv("JOURNAL_STREAM");
    struct stat status;
    if (stream == nullptr || fstat(STDERR_FILENO, &status) != 0) return false;
    return stream == std::to_string(status.st_dev) + ':' + std::to_string(status.st_ino);
  }();
  return isJournal;
}

}  // namespace

LogLine::LogLine(LogLevel level, std::string_view event) : level_(level) {
  Add("level", NameOf(level));
  Add("event", event);
}

LogLine& LogLine::Add(std::string_view key, std::string_view value) {
  if (!text_.empty()) text_ += ' ';
  text_ += key;
  text_ += '=';
  if (IsPlain(value)) {
    text_ += value;
    return *this;
  }
  text_ += '"';
  for (const char c : value) AppendEscaped(text_, c);
  text_ += '"';
  return *this;
}

LogLine& LogLine::Add(std::string_view key, int64_t value) {
  return Add(key, std::to_string(value));
}

void LogLine::Write() const {
  std::string line = IsJournal() ? '<' + std::to_string(static_cast<int>(level_)) + '>'
                                 : "time=" + TimeNow() + ' ';
  line += text_;
  line += '\n';
  // One call, so that lines of several threads do not mix. Nobody is left to tell of a failure.
  ssize_t written = 0;
  do {
    written = write(STDERR_FILENO, line.data(), line.size());
  } while (written < 0 && errno == EINTR);
}

}  // namespace vela
