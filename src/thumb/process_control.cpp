#include "thumb/process_control.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>

#include "convert/photo_convert_job.h"
#include "platform/vlibc.h"
#include "posix/glob_matches.h"
#include "posix/identity.h"
#include "posix/log.h"
#include "posix/processes.h"
#include "storage/log_source.h"
#include "thumb/pid_file.h"

using namespace vela;

namespace {

constexpr char kPidFilePrefix[] = "/var/run/velathumb.";
constexpr char kPidFileSuffix[] = ".pid";

/// The path of this process's pid file, built without the C library's formatting so that the signal
/// handler can use it.
class OwnPidPath {
 public:
  OwnPidPath() noexcept {
    Append(kPidFilePrefix);
    AppendNumber(getpid());
    Append(kPidFileSuffix);
  }
  const char* c_str() const noexcept { return text_; }

 private:
  void Append(const char* part) noexcept {
    while (*part != '\0' && length_ < kPidPathBufferSize - 1) {
      text_[length_++] = *part++;
    }
  }

  void AppendNumber(pid_t number) noexcept {
    char digits[16] = "";
    char* first = digits + sizeof digits - 1;
    do {
      *--first = static_cast<char>('0' + number % 10);
      number /= 10;
    } while (number > 0);
    Append(first);
  }

  char text_[kPidPathBufferSize] = "";
  std::size_t length_ = 0;
};

constexpr const char* BaseName(const char* path) {
  const char* name = path;
  for (const char* c = path; *c != '\0'; ++c) {
    if (*c == '/') {
      name = c + 1;
    }
  }
  return name;
}

}  // namespace

std::string CreatePidFile() {
  const OwnPidPath path;
  const int descriptor = open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0644);
  if (descriptor < 0) {
    const int error = errno;
    LogError(kProgramLogSource, 1133,
             std::string("Failed to open ") + path.c_str() + ". (" + std::strerror(error) + ")");
  } else {
    close(descriptor);
  }
  return path.c_str();
}

void KillThumbProcesses() {
  for (const char* path : GlobMatches(kPidFilePattern)) {
    const long pid = PidOfFile(path);
    if (pid == 0 || StateOfProcess(pid) == ProcessState::kRunning) {
      continue;
    }
    if (unlink(path) != 0) {
      const int error = errno;
      LogError(std::string(kProgramLogSource) + ": KillThumbProcesses(1161) - unlink(" + path +
               "), " + std::strerror(error) + "\n");
    }
  }
}

void OnSigTerm(int /*signal*/) {
  const OwnPidPath path;
  ResumeOwnIdentity();
  unlink(path.c_str());
  VLIBCKill(BaseName(kConvertToolPath), 0);
  _exit(1);
}
