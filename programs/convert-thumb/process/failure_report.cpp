#include "process/failure_report.h"

#include <algorithm>
#include <atomic>
#include <cstdarg>
#include <cstdio>
#include <cstring>

namespace vela {

namespace {

/// Enough for the longest path.
constexpr size_t kMaxLine = 8192;

std::atomic_flag g_isReported = ATOMIC_FLAG_INIT;
char g_line[kMaxLine] = "";
std::atomic<bool> g_isLineComplete{false};

bool IsControl(char character) {
  return static_cast<unsigned char>(character) < ' ';
}

/// Messages of libraries may have several lines, and file names may contain any character.
void MakeOneLine(char* text) {
  char* end = text + std::strlen(text);
  while (end != text && IsControl(end[-1])) {
    --end;
  }
  *end = '\0';
  std::replace_if(text, end, IsControl, ' ');
}

}  // namespace

void ReportFailure(const char* format, ...) {
  if (g_isReported.test_and_set()) {
    return;
  }
  std::va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(g_line, sizeof g_line, format, arguments);
  va_end(arguments);
  MakeOneLine(g_line);
  g_isLineComplete = true;
}

void PrintFailure() {
  if (g_isLineComplete) {
    std::fprintf(stderr, "convert-thumb: %s\n", g_line);
  }
}

}  // namespace vela
