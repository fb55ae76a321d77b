// velathumb-queue [OPTION]...
//
// Processes the photo queue.

#include <cerrno>
#include <string>
#include <vector>

#include "checks/configuration_check.h"
#include "cli/command_line.h"
#include "entry_check.h"
#include "options.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/file_descriptor.h"
#include "posix/file_lock.h"
#include "posix/files.h"
#include "posix/service_log.h"
#include "queue_run.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

constexpr int kEmpty = 0;
constexpr int kEntriesLeft = 1;
constexpr int kError = 2;

constexpr const char* kLockFile = kQueueRunnerLock;

int ToExitStatus(RunEnd end) {
  switch (end) {
    case RunEnd::kEmpty:
      return kEmpty;
    case RunEnd::kDeferred:
    case RunEnd::kStopped:
      return kEntriesLeft;
    case RunEnd::kFailed:
    case RunEnd::kNotRecorded:
      break;
  }
  return kError;
}

/// Makes the paths of the entries absolute. Returns false when one cannot be added, which is
/// logged.
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

/// Returns false when an entry cannot be appended, which is logged.
bool AddToQueue(const std::vector<std::string>& entries) {
  for (const std::string& entry : entries) {
    if (WriteIndexQueue(entry.c_str(), kPhotoQueue.file) != 0) {
      WriteLog(LogLevel::kError, "cannot append to " + std::string(kPhotoQueue.file) + ": " + entry,
               VLIBCErrGet());
      return false;
    }
  }
  return true;
}

/// Returns false when the entries cannot be added, which is logged.
bool AppendEntries(const std::vector<std::string>& entries) {
  if (entries.empty()) {
    return true;
  }
  if (!AddToQueue(entries)) {
    return false;
  }
  // The runner may have taken the queue meanwhile.
  int error = SyncFile(kPhotoQueue.file);
  if (error == 0 || error == ENOENT) {
    error = SyncDirectoryOf(kPhotoQueue.file);
  }
  if (error != 0) {
    WriteLog(LogLevel::kError, std::string("cannot write to the disk: ") + kPhotoQueue.file, error);
  }
  return error == 0;
}

int RunAlone(RunSettings& settings) {
  if (!CheckAdditions(settings.additions) || !AppendEntries(settings.additions)) {
    return kError;
  }
  const FileDescriptor lock = TakeProcessLock(kLockFile, settings.wait);
  if (lock.IsOpen()) {
    LogFindings(settings.velathumb.profileFile);
    return ToExitStatus(RunQueue(settings));
  }
  if (errno == EAGAIN || errno == EACCES) {
    WriteLog(LogLevel::kInfo, "another velathumb-queue is already running");
    return kEntriesLeft;
  }
  WriteLog(LogLevel::kError, std::string("cannot lock ") + kLockFile, errno);
  return kError;
}

}  // namespace

}  // namespace vela

int main(int argc, char** argv) {
  return vela::RunProgram(argc, argv, vela::ParseOptions, vela::RunAlone, vela::kError);
}
