// velathumb-queue [OPTION]...
//
// Processes the photo queue, or adds entries to it for the service that does.

#include <sysexits.h>

#include <cerrno>
#include <string>
#include <utility>

#include "additions.h"
#include "checks/configuration_check.h"
#include "cli/command_line.h"
#include "command_check.h"
#include "options.h"
#include "posix/file_descriptor.h"
#include "posix/file_lock.h"
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

constexpr const char* kLockFile = kQueueRunnerLock;

/// How long systemd is waited for. A machine on which it does not answer is in trouble anyway.
constexpr std::chrono::seconds kServiceLimit(2);

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

bool IsOtherRunning() {
  return StateOfProcessLock(kLockFile) == ProcessLockState::kHeld;
}

/// Returns whether a service does the work, which is logged.
bool LeaveToService(const RunSettings& settings) {
  const ServiceState state = AskForService(kServiceLimit);
  if (!HasService(state)) {
    return false;
  }
  const ServiceText service = DescribeService(state);
  if (service.needsAction && IsOtherRunning()) {
    LogAdditions(LogLevel::kInfo, settings, kRunningText);
    return true;
  }
  LogAdditions(service.needsAction ? LogLevel::kWarning : LogLevel::kInfo, settings, service.text);
  return true;
}

/// The end of a program that cannot take the lock, for the reason `error`.
int EndWithoutLock(const RunSettings& settings, int error) {
  if (error == EAGAIN) {
    WriteLog(LogLevel::kInfo, settings.additions.empty()
                                  ? "another velathumb-queue is already running"
                                  : kRunningText);
    return settings.additions.empty() || WantsWorkHere(settings) ? kEntriesLeft : kDone;
  }
  WriteLog(LogLevel::kError, DescribeRefusal("lock " + std::string(kLockFile), error));
  return kError;
}

int ProcessQueue(const RunSettings& settings, FileDescriptor lock) {
  if (!IsCommandUsable(settings.velathumb)) {
    return kMisconfigured;
  }
  if (!lock.IsOpen()) {
    lock = TakeProcessLock(kLockFile, settings.wait);
  }
  if (!lock.IsOpen()) {
    return EndWithoutLock(settings, errno);
  }
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
  return vela::RunProgram(argc, argv, vela::ParseOptions, vela::Run, vela::kError);
}
