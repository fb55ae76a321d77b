#include "failure_line.h"

#include <algorithm>
#include <atomic>
#include <cstdarg>
#include <cstdio>
#include <cstring>

namespace {

/// Holds the longest path.
constexpr size_t kLongestLine = 8192;

std::atomic_flag g_told = ATOMIC_FLAG_INIT;

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
  char line[kLongestLine] = "";
  std::va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(line, sizeof line, format, arguments);
  va_end(arguments);
  MakeOneLine(line);
  std::fprintf(stderr, "convert-thumb: %s\n", line);
}
