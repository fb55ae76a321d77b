#include "posix/processes.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

namespace vela {

ProcessState StateOfProcess(long pid) {
  const auto id = static_cast<pid_t>(pid);
  if (id != pid) {
    return ProcessState::kGone;
  }
  if (kill(id, 0) == 0) {
    return ProcessState::kRunning;
  }
  return errno == EPERM ? ProcessState::kInaccessible : ProcessState::kGone;
}

void HoldStandardDescriptors() {
  int descriptor = 0;
  do {
    descriptor = open("/dev/null", O_RDWR);
  } while (descriptor >= 0 && descriptor <= STDERR_FILENO);
  if (descriptor > STDERR_FILENO) {
    close(descriptor);
  }
}

void CreateFilesWithExactModes() {
  umask(0);
}

}  // namespace vela
