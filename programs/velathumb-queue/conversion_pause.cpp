#include "conversion_pause.h"

#include <json/value.h>

#include <algorithm>

#include "ipc/absent_daemon.h"
#include "ipc/velamk_ipc.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
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

bool IsTrue(const Json::Value& packet, const char* name) {
  const Json::Value value = packet.isObject() ? packet[name] : Json::Value();
  return value.isConvertibleTo(Json::booleanValue) && value.asBool();
}

}  // namespace

/// Sends the request of IsDisableConvertPhoto, but does not wait half an hour for a daemon that
/// does not answer, because the runner handles no signals meanwhile.
bool PauseGate::IsSwitchedOff() {
  constexpr int kAnswerTimeout = 3;  // seconds
  Json::Value packet(Json::objectValue);
  packet["command"] = "IS_DISABLE_CONVERT_PHOTO";
  const int result = AutoSendRecvPacket(PluginDaemonSocketPath, -1, packet, kAnswerTimeout);
  NoteAbsence(result != 0 && IsNobodyListening(VLIBCErrGet()));
  return IsTrue(packet, "success") && IsTrue(packet, "result");
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
