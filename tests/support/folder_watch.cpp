#include "support/folder_watch.h"

#include <sys/inotify.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "support/environment_failure.h"

namespace vela_test {

FolderWatch::FolderWatch(const std::vector<std::string>& folders, uint32_t events)
    : queue_(inotify_init1(IN_CLOEXEC)) {
  for (const std::string& folder : folders) {
    const int watch = inotify_add_watch(queue_.Get(), folder.c_str(), events);
    if (watch < 0) {
      EnvironmentFailureWithErrno("cannot watch " + folder);
    }
    folders_[watch] = folder;
  }
}

void FolderWatch::Follow(
    const std::function<void(const std::string& path, uint32_t event)>& react) const {
  alignas(inotify_event) char buffer[65536];
  for (;;) {
    const ssize_t count = read(queue_.Get(), buffer, sizeof buffer);
    if (count <= 0 && errno != EINTR) {
      EnvironmentFailureWithErrno("cannot watch a folder any longer");
    }
    for (ssize_t place = 0; place < count;) {
      const auto* const event = reinterpret_cast<const inotify_event*>(buffer + place);
      const auto folder = folders_.find(event->wd);
      if (event->len > 0 && folder != folders_.end()) {
        react(folder->second + "/" + event->name, event->mask);
      }
      place += static_cast<ssize_t>(sizeof(inotify_event) + event->len);
    }
  }
}

}  // namespace vela_test
