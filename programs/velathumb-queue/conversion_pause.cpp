#include "conversion_pause.h"

#include <json/value.h>
#include <sys/time.h>

#include <algorithm>

#include "ipc/velamk_ipc.h"
#include "platform/velaindex.h"
#include "progress/velamk_progress.h"
#include "run_log.h"

namespace vela {

namespace {

/// How long the answer that conversion may run is good for: entries can follow each other fast.
constexpr std::chrono::seconds kAnswerLife(1);
/// The resume time may be brought forward, and a switch be turned, at any moment.
constexpr std::chrono::seconds kLongestWait(5);

std::chrono::seconds WaitForResumeTime() {
  timeval wait = {};
  GetThumbConvResumeWait(&wait);
  // A negative resume time is never reached but has no wait either.
  return std::clamp(std::chrono::seconds(wait.tv_sec), std::chrono::seconds(1), kLongestWait);
}

/// A machine without settings has no resume time; asking for it would only fill the log.
bool IsResumeTimeReached() {
  return IsFileExist("/etc/velainfo.conf") == 0 || IsThumbConvResumeTimeReached() == 1;
}

bool IsTrue(const Json::Value& packet, const char* name) {
  const Json::Value value = packet.isObject() ? packet[name] : Json::Value();
  return value.isConvertibleTo(Json::booleanValue) && value.asBool();
}

/// Asks what IsDisableConvertPhoto asks, but does not wait half an hour for a daemon that keeps
/// still: the runner hears no signal meanwhile.
bool IsSwitchedOff() {
  constexpr int kLongestAnswer = 3;
  Json::Value packet(Json::objectValue);
  packet["command"] = "IS_DISABLE_CONVERT_PHOTO";
  AutoSendRecvPacket(PluginDaemonSocketPath, -1, packet, kLongestAnswer);
  return IsTrue(packet, "success") && IsTrue(packet, "result");
}

}  // namespace

std::optional<ConversionPause> FindConversionPause() {
  if (!IsResumeTimeReached()) {
    return ConversionPause{"conversion is held back by its resume time", WaitForResumeTime()};
  }
  if (IsSwitchedOff()) {
    return ConversionPause{"the index service has switched photo conversion off", kLongestWait};
  }
  return std::nullopt;
}

bool PauseGate::MayStart() {
  const auto asked = Clock::now();
  if (pausedUntil_ && asked < *pausedUntil_) {
    return false;
  }
  if (asked < mayStartUntil_) {
    return true;
  }
  const auto pause = FindConversionPause();
  const auto now = Clock::now();
  if (!pause) {
    // An answer that took its time is good for longer, or nothing else would be done.
    mayStartUntil_ = now + kAnswerLife + 10 * (now - asked);
    pausedUntil_.reset();
    reason_.clear();
    return true;
  }
  if (pause->reason != reason_) {
    WriteLog(LogLevel::kInfo, "waiting: " + pause->reason);
    reason_ = pause->reason;
  }
  pausedUntil_ = now + pause->askAgain;
  return false;
}

}  // namespace vela
