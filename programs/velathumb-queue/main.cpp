// velathumb-queue [OPTION]...
//
// Processes the photo queue, or adds entries to it for the service that does.

#include <sysexits.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "additions.h"
#include "checks/configuration_check.h"
#include "cli/command_line.h"
#include "command_check.h"
#include "options.h"
#include "posix/deadline.h"
#include "posix/file_descriptor.h"
#include "posix/file_lock.h"
#include "posix/files.h"
#include "posix/service_log.h"
#include "queue_run.h"
#include "service_state.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

/// The queue is empty, or the entries were left to another runner.
constexpr int kDone = 0;
constexpr int kEntriesLeft = 1;
constexpr int kError = 2;
/// Nothing but a change of the configuration helps: systemd need not start the program again.
constexpr int kMisconfigured = EX_CONFIG;
/// The same for the command line, which must not look like an error that may pass.
constexpr int kInvalidCommandLine = EX_USAGE;

constexpr const char* kLockFile = kQueueRunnerLock;

/// How long systemd is waited for. A machine on which it does not answer is in trouble anyway.
constexpr std::chrono::seconds kServiceLimit(2);

/// How long a runner that is about to end is waited for: it may have seen the queue before the
/// entries were added. It is asked at this interval.
constexpr std::chrono::seconds kEndLimit(1);
constexpr std::chrono::milliseconds kEndInterval(20);

int ToExitStatus(RunEnd end) {
  switch (end) {
    case RunEnd::kEmpty:
      return kDone;
    case RunEnd::kDeferred:
    case RunEnd::kStopped:
      return kEntriesLeft;
    case RunEnd::kMisconfigured:
      return kMisconfigured;
    case RunEnd::kFailed:
    case RunEnd::kNotRecorded:
      break;
  }
  return kError;
}

/// Returns whether the entries that were added are processed here even if a service could do that.
bool WantsWorkHere(const RunSettings& settings) {
  return settings.now || settings.wait || settings.follow;
}

/// Says who processes the entries that were added.
void LogAdditions(LogLevel level, const RunSettings& settings, const std::string& worker) {
  const std::string end = worker.empty() ? "" : "; " + worker;
  WriteLog(level, DescribeAdditions(settings.additions) + end);
}

bool IsQueueTaken() {
  return !ExamineFile(kPhotoQueue.file).has_value();
}

/// Returns whether another runner has taken the additions, or runs for longer than one that is
/// about to end.
bool IsOtherRunning() {
  const Deadline deadline(kEndLimit);
  while (StateOfProcessLock(kLockFile) == ProcessLockState::kHeld) {
    if (IsQueueTaken() || deadline.Left() == Deadline::Clock::duration::zero()) {
      return true;
    }
    std::this_thread::sleep_for(kEndInterval);
  }
  return false;
}

/// Returns whether a service does the work, which is logged.
bool LeaveToService(const RunSettings& settings) {
  const ServiceState state = AskForService(kServiceLimit);
  if (state.isKnown && !HasService(state)) {
    return false;
  }
  const ServiceText service = DescribeService(state);
  // One that is being stopped has the lock until its end.
  if (service.needsAction && !state.isStopping && IsOtherRunning()) {
    LogAdditions(LogLevel::kInfo, settings, kRunningText);
    return true;
  }
  LogAdditions(service.needsAction ? LogLevel::kWarning : LogLevel::kInfo, settings, service.text);
  return true;
}

/// Takes the lock, also that of a runner which ends without having taken the additions. Returns
/// none with errno set when it cannot be taken.
FileDescriptor TakeLock(const RunSettings& settings) {
  const Deadline deadline(kEndLimit);
  for (;;) {
    FileDescriptor lock = TakeProcessLock(kLockFile, settings.wait);
    const int error = errno;
    if (lock.IsOpen() || error != EAGAIN || settings.additions.empty() || IsQueueTaken() ||
        deadline.Left() == Deadline::Clock::duration::zero()) {
      errno = error;
      return lock;
    }
    std::this_thread::sleep_for(kEndInterval);
  }
}

/// Says who processes the additions while another runner has the lock.
void LogOtherRunner() {
  if (IsQueueTaken()) {
    WriteLog(LogLevel::kInfo, kRunningText);
  } else {
    WriteLog(LogLevel::kWarning,
             std::string(kRunningText) + " unless it is being stopped; then they stay queued");
  }
}

/// The end of a program that cannot take the lock, for the reason `error`.
int EndWithoutLock(const RunSettings& settings, int error) {
  if (error == EAGAIN && settings.additions.empty()) {
    WriteLog(LogLevel::kInfo, "another velathumb-queue is already running");
    return kEntriesLeft;
  }
  if (error == EAGAIN) {
    LogOtherRunner();
    return WantsWorkHere(settings) ? kEntriesLeft : kDone;
  }
  WriteLog(LogLevel::kError, DescribeRefusal("lock " + std::string(kLockFile), error));
  return kError;
}

/// Waits a second when the profile has errors: it may just be being written.
void AwaitWriter(const std::string& profileFile) {
  const std::vector<Finding> findings = CheckProfile(profileFile).findings;
  if (std::any_of(findings.begin(), findings.end(),
                  [](const Finding& finding) { return finding.severity == Severity::kError; })) {
    std::this_thread::sleep_for(std::chrono::seconds(1));
  }
}

int ProcessQueue(const RunSettings& settings, FileDescriptor lock) {
  if (!IsCommandUsable(settings.velathumb)) {
    return kMisconfigured;
  }
  if (!lock.IsOpen()) {
    lock = TakeLock(settings);
  }
  if (!lock.IsOpen()) {
    return EndWithoutLock(settings, errno);
  }
  AwaitWriter(settings.velathumb.profileFile);
  if (!LogFindings(settings.velathumb.profileFile)) {
    WriteLog(LogLevel::kError, "the queue is kept until the errors are corrected");
    return kMisconfigured;
  }
  return ToExitStatus(RunQueue(settings));
}

int AddAndProcess(const RunSettings& settings) {
  // Before the entries are in the queue: then systemd starts the service, which must not be faster.
  FileDescriptor lock;
  if (WantsWorkHere(settings)) {
    lock = TakeProcessLock(kLockFile, false);
  }
  if (!AppendEntries(settings.additions)) {
    return kError;
  }
  if (!settings.queueOnly && !WantsWorkHere(settings) && LeaveToService(settings)) {
    return kDone;
  }
  LogAdditions(LogLevel::kInfo, settings, "");
  return settings.queueOnly ? kDone : ProcessQueue(settings, std::move(lock));
}

int Run(RunSettings& settings) {
  if (!CheckAdditions(settings.additions)) {
    return kError;
  }
  return settings.additions.empty() ? ProcessQueue(settings, FileDescriptor())
                                    : AddAndProcess(settings);
}

}  // namespace

}  // namespace vela

int main(int argc, char** argv) {
  return vela::RunProgram(argc, argv, vela::ParseOptions, vela::Run, vela::kError,
                          vela::kInvalidCommandLine);
}
