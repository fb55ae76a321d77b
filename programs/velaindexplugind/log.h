// The daemon's log: lines of key=value on standard error.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace vela {

/// Levels as the system log numbers them.
enum class LogLevel { kError = 3, kWarning = 4, kInfo = 6 };

/// One line of the log. Values are quoted where they need it.
///
///     LogLine(LogLevel::kInfo, "stop").Add("signal", "SIGTERM").Write();
class LogLine {
 public:
  LogLine(LogLevel level, std::string_view event);

  LogLine& Add(std::string_view key, std::string_view value);
  LogLine& Add(std::string_view key, int64_t value);

  /// Writes the line to standard error. Where that leads to the journal, the journal's mark of the
  /// level stands before it; elsewhere the line begins with the time.
  void Write() const;

 private:
  LogLevel level_;
  std::string text_;
};

}  // namespace vela
