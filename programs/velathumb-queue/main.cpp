// velathumb-queue [OPTION]...
//
// Works the photo queue off.

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <exception>
#include <string>
#include <utility>
#include <vector>

#include "entry_check.h"
#include "file_place.h"
#include "options.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/file_descriptor.h"
#include "queue_run.h"
#include "run_log.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

constexpr int kDone = 0;
constexpr int kLeft = 1;
constexpr int kError = 2;

constexpr char kLockFile[] = "/var/run/velathumb-queue.lock";

int ToExitStatus(RunEnd end) {
  switch (end) {
    case RunEnd::kEmpty:
      return kDone;
    case RunEnd::kLeft:
    case RunEnd::kStopped:
      return kLeft;
    case RunEnd::kFailed:
      break;
  }
  return kError;
}

/// Makes the entries that are to be added mean the same to everybody. Returns false, told in the
/// log, when one cannot be added.
bool CheckAdditions(std::vector<std::string>& entries) {
  for (std::string& entry : entries) {
    const std::string fault = CheckAddition(entry);
    if (!fault.empty()) {
      WriteLog(LogLevel::kError, "cannot add " + entry + ": " + fault);
      return false;
    }
  }
  return true;
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
bool LockForProcess(int descriptor, bool wait) {
  struct flock whole = {};
  whole.l_type = F_WRLCK;
  whole.l_whence = SEEK_SET;
  return fcntl(descriptor, wait ? F_SETLKW : F_SETLK, &whole) == 0;
}

/// Takes the lock that one runner at a time has; the file may be removed while somebody waits.
/// Returns no open descriptor, with errno set, when it cannot be had.
FileDescriptor TakeRunnerLock(bool wait) {
  for (;;) {
    FileDescriptor lock(open(kLockFile, O_RDWR | O_CREAT | O_CLOEXEC | O_NOCTTY, 0644));
    if (!lock.IsOpen() || !LockForProcess(lock.Get(), wait)) {
      const int error = errno;
      lock.Close();
      errno = error;
      return lock;
    }
    if (IsAtPath(lock.Get(), kLockFile)) {
      return lock;
    }
  }
}

int RunAlone(RunSettings settings) {
  if (!CheckAdditions(settings.additions) || !AppendEntries(settings.additions)) {
    return kError;
  }
  const FileDescriptor lock = TakeRunnerLock(settings.wait);
  if (lock.IsOpen()) {
    return ToExitStatus(RunQueue(settings));
  }
  if (errno == EAGAIN || errno == EACCES) {
    WriteLog(LogLevel::kInfo, "another velathumb-queue is running and has the work");
    return kLeft;
  }
  WriteLog(LogLevel::kError, std::string("cannot lock ") + kLockFile + ": " + ErrnoText(errno));
  return kError;
}

int RunMain(int argc, char** argv) {
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
    return RunAlone(std::move(settings));
  } catch (const std::exception& error) {
    WriteLog(LogLevel::kError, error.what());
    return kError;
  }
}

}  // namespace

}  // namespace vela

int main(int argc, char** argv) {
  return vela::RunMain(argc, argv);
}
