#include "conversion_pause.h"

#include <algorithm>

#include "ipc/photo_switch.h"
#include "ipc/velamk_ipc.h"
#include "posix/service_log.h"
#include "progress/resume_state.h"

namespace vela {

namespace {

/// How long the answer that conversion may run is valid, so that short entries do not cause a
/// request each.
constexpr std::chrono::seconds kAnswerValidity(1);
/// Both the resume time and the switch may change at any moment.
constexpr std::chrono::seconds kLongestWait(5);

std::chrono::seconds TimeToNextCheck() {
  // A negative resume time is never reached, but the time until then is reported as 0.
  return std::clamp(TimeUntilResume(), std::chrono::seconds(1), kLongestWait);
}

}  // namespace

/// Does not wait half an hour for a daemon that does not answer, because the runner handles no
/// signals meanwhile.
bool PauseGate::IsSwitchedOff() {
  constexpr std::chrono::seconds kAnswerLimit(3);
  const PhotoSwitch answer = AskPhotoSwitch(kAnswerLimit);
  NoteAbsence(answer.isNobodyListening);
  return answer.isOff;
}

void PauseGate::NoteAbsence(bool isAbsent) {
  if (isAbsent && !isDaemonAbsent_) {
    WriteLog(LogLevel::kWarning, std::string("no index daemon listens at ") +
                                     PluginDaemonSocketPath +
                                     ": photos are processed, but not reported to it");
  } else if (!isAbsent && isDaemonAbsent_) {
    WriteLog(LogLevel::kInfo, "an index daemon listens again");
  }
  isDaemonAbsent_ = isAbsent;
}

std::optional<ConversionPause> PauseGate::FindPause() {
  if (IsPausedByResumeTime()) {
    return ConversionPause{"the resume time is not reached", TimeToNextCheck()};
  }
  if (IsSwitchedOff()) {
    return ConversionPause{"the index service has switched photo conversion off", kLongestWait};
  }
  return std::nullopt;
}

bool PauseGate::MayStart() {
  const auto start = Clock::now();
  if (pausedUntil_ && start < *pausedUntil_) {
    return false;
  }
  if (start < allowedUntil_) {
    return true;
  }
  const auto pause = FindPause();
  const auto now = Clock::now();
  if (!pause) {
    // A slow answer is valid for longer, or the runner would spend its time on requests.
    allowedUntil_ = now + kAnswerValidity + 10 * (now - start);
    pausedUntil_.reset();
    reason_.clear();
    return true;
  }
  if (pause->reason != reason_) {
    WriteLog(LogLevel::kInfo, "conversion is paused: " + pause->reason);
    reason_ = pause->reason;
  }
  pausedUntil_ = now + pause->checkAfter;
  return false;
}

}  // namespace vela
