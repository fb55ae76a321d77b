#include "posix/wake_up_signal.h"

#include <sys/eventfd.h>

#include <cerrno>

namespace vela {

int WakeUpSignal::Open() {
  signal_ = FileDescriptor(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK));
  return signal_.IsOpen() ? 0 : errno;
}

void WakeUpSignal::Set() const {
  // Fails only when the counter is at its maximum, and then the signal is set.
  eventfd_write(signal_.Get(), 1);
}

void WakeUpSignal::Clear() const {
  eventfd_t count = 0;
  eventfd_read(signal_.Get(), &count);
}

}  // namespace vela
