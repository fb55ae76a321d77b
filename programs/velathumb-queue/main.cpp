// velathumb-queue [OPTION]...
//
// Works the photo queue off.

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <exception>
#include <string>
#include <vector>

#include "options.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "queue_run.h"
#include "run_log.h"
#include "storage/creation_queue.h"
#include "thumb/descriptor.h"

namespace {

constexpr int kDone = 0;
constexpr int kStopped = 1;
constexpr int kError = 2;

constexpr char kLockFile[] = "/var/run/velathumb-queue.lock";

int ToExitStatus(RunEnd end) {
  switch (end) {
    case RunEnd::kEmpty:
      return kDone;
    case RunEnd::kStopped:
      return kStopped;
    case RunEnd::kFailed:
      break;
  }
  return kError;
}

/// Returns false, told in the log, when an entry cannot be appended.
bool AppendEntries(const std::vector<std::string>& entries) {
  for (const std::string& entry : entries) {
    if (WriteIndexQueue(entry.c_str(), kPhotoQueue.file) != 0) {
      WriteLog(LogLevel::kError, "cannot append to " + std::string(kPhotoQueue.file) + ": " +
                                     entry + ": " + ErrnoText(VLIBCErrGet()));
      return false;
    }
  }
  return true;
}

/// A lock that no child shares: that of a runner that is killed is free at once, also when it was
/// about to start a velathumb.
bool LockForProcess(int descriptor) {
  struct flock whole = {};
  whole.l_type = F_WRLCK;
  whole.l_whence = SEEK_SET;
  return fcntl(descriptor, F_SETLK, &whole) == 0;
}

int RunAlone(const RunSettings& settings) {
  if (!AppendEntries(settings.additions)) {
    return kError;
  }
  const Descriptor lock(open(kLockFile, O_RDWR | O_CREAT | O_CLOEXEC | O_NOCTTY, 0644));
  if (!lock.IsOpen()) {
    WriteLog(LogLevel::kError, std::string("cannot open ") + kLockFile + ": " + ErrnoText(errno));
    return kError;
  }
  if (!LockForProcess(lock.Get())) {
    WriteLog(LogLevel::kError, "another velathumb-queue is running");
    return kStopped;
  }
  return ToExitStatus(RunQueue(settings));
}

}  // namespace

int main(int argc, char** argv) {
  RunSettings settings;
  switch (ParseOptions(argc, argv, settings)) {
    case ParseOutcome::kDone:
      return kDone;
    case ParseOutcome::kWrong:
      return kError;
    case ParseOutcome::kRun:
      break;
  }
  try {
    return RunAlone(settings);
  } catch (const std::exception& error) {
    WriteLog(LogLevel::kError, error.what());
    return kError;
  }
}
