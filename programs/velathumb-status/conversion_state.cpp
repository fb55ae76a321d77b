#include "conversion_state.h"

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

}  // namespace

ConversionState ReadConversionState() {
  ConversionState state;
  state.progress = ReadProgressState();
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
  state.resume = ReadPause();
  if (!state.resume.isReached) {
    state.activity = Activity::kPaused;
  } else if (hasRunner) {
    state.activity = Activity::kRunning;
  } else if (hasEntries) {
    state.activity = Activity::kWaiting;
  }
  return state;
}

}  // namespace vela
