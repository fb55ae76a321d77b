#include "posix/terminal.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdlib>
#include <string_view>

namespace vela {

namespace {

int WidthOf(int fd) {
  constexpr int kUsualWidth = 80;
  winsize size = {};
  const bool isKnown = ioctl(fd, TIOCGWINSZ, &size) == 0 && size.ws_col > 0;
  return isKnown ? size.ws_col : kUsualWidth;
}

}  // namespace

bool IsOutputTerminal() {
  return isatty(STDOUT_FILENO) == 1;
}

int TerminalWidth() {
  return WidthOf(STDOUT_FILENO);
}

bool IsErrorTerminal() {
  const char* kind = std::getenv("TERM");
  const bool isDumb = kind != nullptr && std::string_view(kind) == "dumb";
  return !isDumb && isatty(STDERR_FILENO) == 1;
}

int ErrorTerminalWidth() {
  return WidthOf(STDERR_FILENO);
}

}  // namespace vela
