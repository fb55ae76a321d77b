#include "thumb/directory_lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <syslog.h>
#include <unistd.h>

#include "thumb/log_source.h"

namespace vela {

DirectoryLock::DirectoryLock(const std::string& path) {
  // Whatever else bears the name, a pipe for one, must not make the open wait.
  const int descriptor = open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
  if (descriptor < 0) {
    syslog(LOG_ERR, "%s:%d Failed to open %s", kLogSource, 844, path.c_str());
    return;
  }
  if (flock(descriptor, LOCK_EX | LOCK_NB) != 0) {
    syslog(LOG_ERR, "%s:%d Failed to lock %s", kLogSource, 849, path.c_str());
    close(descriptor);
    return;
  }
  descriptor_ = descriptor;
}

DirectoryLock::~DirectoryLock() {
  if (IsHeld()) {
    flock(descriptor_, LOCK_UN);
    close(descriptor_);
  }
}

}  // namespace vela
