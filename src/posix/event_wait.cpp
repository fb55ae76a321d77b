#include "posix/event_wait.h"

#include <poll.h>
#include <sys/inotify.h>
#include <sys/signalfd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <filesystem>

namespace vela {

int AwaitEvent(int fd, short events, const Deadline& deadline) {
  pollfd entry{fd, events, 0};
  for (;;) {
    const int ready = poll(&entry, 1, deadline.PollMilliseconds());
    if (ready > 0) {
      return 0;
    }
    if (ready < 0 && errno != EINTR) {
      return errno;
    }
    if (deadline.Left() == std::chrono::nanoseconds::zero()) {
      return ETIMEDOUT;
    }
  }
}

int EventWait::Open(const std::string& watchedFile) {
  sigset_t set;
  sigemptyset(&set);
  for (const int signal : {SIGCHLD, SIGTERM, SIGINT}) {
    sigaddset(&set, signal);
  }
  if (sigprocmask(SIG_BLOCK, &set, nullptr) != 0) {
    return errno;
  }
  signals_ = FileDescriptor(signalfd(-1, &set, SFD_CLOEXEC | SFD_NONBLOCK));
  changes_ = FileDescriptor(inotify_init1(IN_CLOEXEC | IN_NONBLOCK));
  if (!signals_.IsOpen() || !changes_.IsOpen()) {
    return errno;
  }
  const std::string directory = std::filesystem::path(watchedFile).parent_path();
  constexpr uint32_t kChanges = IN_CREATE | IN_MOVED_TO | IN_CLOSE_WRITE;
  return inotify_add_watch(changes_.Get(), directory.c_str(), kChanges) >= 0 ? 0 : errno;
}

void EventWait::ReadSignals() {
  signalfd_siginfo info = {};
  while (read(signals_.Get(), &info, sizeof info) == static_cast<ssize_t>(sizeof info)) {
    isStopping_ = isStopping_ || info.ssi_signo != SIGCHLD;
  }
}

bool EventWait::MustStop() const {
  sigset_t pending;
  if (isStopping_ || sigpending(&pending) != 0) {
    return isStopping_;
  }
  return sigismember(&pending, SIGTERM) == 1 || sigismember(&pending, SIGINT) == 1;
}

void EventWait::DiscardChanges() {
  alignas(inotify_event) char events[4096];
  while (read(changes_.Get(), events, sizeof events) > 0) {
  }
}

void EventWait::Wait(std::optional<std::chrono::milliseconds> timeout) {
  constexpr std::chrono::milliseconds kLongest = std::chrono::hours(1);
  const int limit =
      timeout
          ? static_cast<int>(std::clamp(*timeout, std::chrono::milliseconds(0), kLongest).count())
          : -1;
  pollfd sources[] = {{signals_.Get(), POLLIN, 0}, {changes_.Get(), POLLIN, 0}};
  poll(sources, 2, limit);
  ReadSignals();
  DiscardChanges();
}

}  // namespace vela
