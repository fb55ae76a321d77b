#include "conversion_state.h"

#include <string>

#include "ipc/photo_switch.h"
#include "platform/system_rules.h"
#include "posix/file_lock.h"
#include "posix/files.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

/// Returns the pause, none when the settings cannot be read: asking again and again would fill the
/// system log.
ResumeState ReadPause() {
  if (CheckAccess(kSettingsFile, FileAccess::kRead) == 0) {
    return ReadResumeState();
  }
  ResumeState none;
  none.isReached = true;
  return none;
}

int64_t CountDeferred() {
  int64_t count = 0;
  ForEachQueueEntry(kDeferredPhotosFile,
                    [&count](const std::string& entry) { count += entry.empty() ? 0 : 1; });
  return count;
}

}  // namespace

bool ConversionObserver::IsSwitchedOff() {
  constexpr std::chrono::seconds kAnswerLimit(2);
  constexpr std::chrono::seconds kAnswerValidity(1);
  const auto begin = Clock::now();
  if (begin >= validUntil_) {
    isSwitchedOff_ = AskPhotoSwitch(kAnswerLimit).isOff;
    const auto end = Clock::now();
    // A daemon that answers slowly is asked less often: nothing is shown meanwhile.
    validUntil_ = end + kAnswerValidity + 10 * (end - begin);
  }
  return isSwitchedOff_;
}

void ConversionObserver::FindPause(ConversionState& state) {
  state.resume = ReadPause();
  if (!state.resume.isReached) {
    state.pause = Pause::kResumeTime;
  } else if (IsSwitchedOff()) {
    state.pause = Pause::kIndexService;
  }
}

ConversionState ConversionObserver::Read() {
  ConversionState state;
  state.progress = ReadProgressState();
  state.deferred = CountDeferred();
  if (!state.progress.instances.empty()) {
    state.activity = Activity::kRunning;
    state.mayContinue = true;
    return state;
  }
  // Between two entries no velathumb is running. The lock is examined before the queue: a runner
  // that ends meanwhile has emptied the queue, and one that begins finds entries in it.
  const bool hasRunner = StateOfProcessLock(kQueueRunnerLock) == ProcessLockState::kHeld;
  const bool hasEntries = !hasRunner && HasPhotosToProcess();
  state.mayContinue = hasRunner || hasEntries;
  FindPause(state);
  if (state.pause != Pause::kNone) {
    state.activity = Activity::kPaused;
  } else if (hasRunner) {
    state.activity = Activity::kRunning;
  } else if (hasEntries) {
    state.activity = Activity::kWaiting;
  }
  return state;
}

std::string PauseText(const ConversionState& state) {
  return state.pause == Pause::kIndexService
             ? "conversion is paused: the index service has switched it off"
             : ResumeText(state.resume);
}

}  // namespace vela
