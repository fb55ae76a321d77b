#include "posix/terminal.h"

#include <sys/ioctl.h>
#include <unistd.h>

namespace vela {

bool IsOutputTerminal() {
  return isatty(STDOUT_FILENO) == 1;
}

int TerminalWidth() {
  constexpr int kUsualWidth = 80;
  winsize size = {};
  const bool isKnown = ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0;
  return isKnown ? size.ws_col : kUsualWidth;
}

}  // namespace vela
