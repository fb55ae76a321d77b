// The daemon's log: lines of key=value on standard error.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "posix/service_log.h"

namespace vela {

/// One line of the log. Values with other than plain characters are quoted.
///
///     LogLine(LogLevel::kInfo, "stop").Add("signal", "SIGTERM").Write();
class LogLine {
 public:
  LogLine(LogLevel level, std::string_view event);

  LogLine& Add(std::string_view key, std::string_view value);
  LogLine& Add(std::string_view key, int64_t value);

  /// Writes the line to the log of the service; outside the journal, which notes the time itself,
  /// with the time as its first field.
  void Write() const;

 private:
  LogLevel level_;
  std::string text_;
};

}  // namespace vela
