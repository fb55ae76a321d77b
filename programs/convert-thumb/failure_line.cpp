#include "failure_line.h"

#include <algorithm>
#include <atomic>
#include <cstdarg>
#include <cstdio>
#include <cstring>

namespace vela {

namespace {

/// Holds the longest path.
constexpr size_t kLongestLine = 8192;

std::atomic_flag g_told = ATOMIC_FLAG_INIT;
char g_line[kLongestLine] = "";
std::atomic<bool> g_isLineWhole{false};

bool IsControl(char character) {
  return static_cast<unsigned char>(character) < ' ';
}

/// Messages of libraries come in several lines, and names may hold anything.
void MakeOneLine(char* text) {
  char* end = text + std::strlen(text);
  while (end != text && IsControl(end[-1])) {
    --end;
  }
  *end = '\0';
  std::replace_if(text, end, IsControl, ' ');
}

}  // namespace

void TellFailure(const char* format, ...) {
  if (g_told.test_and_set()) {
    return;
  }
  std::va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(g_line, sizeof g_line, format, arguments);
  va_end(arguments);
  MakeOneLine(g_line);
  g_isLineWhole = true;
}

void WriteFailureLine() {
  if (g_isLineWhole) {
    std::fprintf(stderr, "convert-thumb: %s\n", g_line);
  }
}

}  // namespace vela
