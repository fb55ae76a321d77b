#include "progress/resume_state.h"

#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "progress/velamk_progress.h"

namespace vela {

namespace {

bool HasSettings() {
  return IsFileExist(kSettingsFile) != 0;
}

}  // namespace

ResumeState ReadResumeState() {
  ResumeState state;
  if (!HasSettings()) {
    state.isReached = true;
    return state;
  }
  state.resumeTime = GetThumbConvResumeTime();
  state.isReached = IsThumbConvResumeTimeReached() == 1;
  state.waitSeconds = static_cast<long>(TimeUntilResume().count());
  return state;
}

bool IsPausedByResumeTime() {
  return HasSettings() && IsThumbConvResumeTimeReached() != 1;
}

std::chrono::seconds TimeUntilResume() {
  timeval wait = {};
  GetThumbConvResumeWait(&wait);
  return std::chrono::seconds(wait.tv_sec);
}

}  // namespace vela
