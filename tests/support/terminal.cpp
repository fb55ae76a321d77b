#include "support/terminal.h"

#include <fcntl.h>
#include <poll.h>
#include <stdlib.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <chrono>

#include "support/environment_failure.h"

namespace vela_test {

Terminal::Terminal(int columns)
    : testSide_(posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC | O_NONBLOCK)) {
  if (!testSide_.IsOpen() || grantpt(testSide_.Get()) != 0 || unlockpt(testSide_.Get()) != 0) {
    EnvironmentFailureWithErrno("cannot make a terminal");
  }
  // Not by its name, which may refer to another terminal when /dev/pts is not the one that the
  // terminal was made in.
  programSide_ = Descriptor(ioctl(testSide_.Get(), TIOCGPTPEER, O_RDWR | O_NOCTTY | O_CLOEXEC));
  winsize size = {};
  size.ws_row = 24;
  size.ws_col = static_cast<unsigned short>(columns);
  if (!programSide_.IsOpen() || ioctl(programSide_.Get(), TIOCSWINSZ, &size) != 0) {
    EnvironmentFailureWithErrno("cannot set up a terminal");
  }
}

void Terminal::Read(int milliseconds) {
  pollfd ready = {testSide_.Get(), POLLIN, 0};
  if (poll(&ready, 1, milliseconds) <= 0) {
    return;
  }
  char bytes[4096];
  ssize_t count = 0;
  while ((count = read(testSide_.Get(), bytes, sizeof bytes)) > 0) {
    written_.append(bytes, static_cast<size_t>(count));
  }
}

bool Terminal::WaitForText(const std::string& text, int milliseconds) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(milliseconds);
  while (written_.find(text) == std::string::npos) {
    if (std::chrono::steady_clock::now() > end) {
      return false;
    }
    Read(50);
  }
  return true;
}

std::string Terminal::Written() {
  Read(0);
  return written_;
}

}  // namespace vela_test
