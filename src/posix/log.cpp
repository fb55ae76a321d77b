#include "posix/log.h"

#include <syslog.h>

#include <cstdio>

namespace vela {

static_assert(kErrorPriority == LOG_ERR);

void LogError(std::string_view source, int line, std::string_view text) {
  syslog(LOG_ERR, "%.*s:%d %.*s", static_cast<int>(source.size()), source.data(), line,
         static_cast<int>(text.size()), text.data());
}

void LogError(std::string_view text) {
  syslog(LOG_ERR, "%.*s", static_cast<int>(text.size()), text.data());
}

std::string LogText(const char* text) {
  return text == nullptr ? "(null)" : text;
}

std::string LogCode(int code) {
  char text[16] = "";
  std::snprintf(text, sizeof text, "0x%04X", static_cast<unsigned>(code));
  return text;
}

}  // namespace vela
