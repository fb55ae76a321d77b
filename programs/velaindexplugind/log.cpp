#include "log.h"

#include <array>
#include <cstdio>
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
    if (!IsPlain(c)) {
      return false;
    }
  }
  return !value.empty();
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

}  // namespace

LogLine::LogLine(LogLevel level, std::string_view event) : level_(level) {
  Add("level", NameOf(level));
  Add("event", event);
}

LogLine& LogLine::Add(std::string_view key, std::string_view value) {
  if (!text_.empty()) {
    text_ += ' ';
  }
  text_ += key;
  text_ += '=';
  if (IsPlain(value)) {
    text_ += value;
    return *this;
  }
  text_ += '"';
  for (const char c : value) {
    if (c == '"' || c == '\\') {
      text_ += '\\';
    }
    text_ += c;
  }
  text_ += '"';
  return *this;
}

LogLine& LogLine::Add(std::string_view key, int64_t value) {
  return Add(key, std::to_string(value));
}

void LogLine::Write() const {
  WriteLog(level_, IsLogInJournal() ? text_ : "time=" + TimeNow() + ' ' + text_);
}

}  // namespace vela
