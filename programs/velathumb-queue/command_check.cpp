#include "command_check.h"

#include <chrono>
#include <cstring>
#include <string>
#include <thread>

#include "checks/configuration_check.h"
#include "posix/deadline.h"
#include "posix/files.h"
#include "posix/service_log.h"
#include "profiles/thumbnail_profile.h"

namespace vela {

namespace {

/// How long the writer of a profile has, and how often a request to stop is looked for meanwhile.
constexpr std::chrono::seconds kSecondLook(1);
constexpr std::chrono::milliseconds kStopInterval(20);

/// Returns why velathumb would make no thumbnail with this profile file, empty when it would.
std::string FindProfileFault(const std::string& profileFile) {
  const int error = CheckAccess(profileFile, FileAccess::kRead);
  if (error != 0) {
    return "cannot read the profile " + profileFile + ": " + std::strerror(error);
  }
  ThumbnailProfileList profiles;
  if (ParseThumbnailProfiles(profiles, profileFile, "/") == 0) {
    const std::string where = FirstErrorOfProfile(profileFile);
    return "cannot parse the profile " + profileFile + (where.empty() ? "" : ": ") + where;
  }
  if (GetProfileCount(profiles, kAllPhases) == 0) {
    return "the profile " + profileFile +
           " defines no thumbnail, or photo_thumb_size_map excludes all of them";
  }
  return {};
}

/// Returns whether there is no fault; otherwise it is logged.
bool IsFaultless(const std::string& fault) {
  if (!fault.empty()) {
    WriteLog(LogLevel::kError, fault);
  }
  return fault.empty();
}

}  // namespace

ProfileState CheckProfileUse(const std::string& profileFile,
                             const std::function<bool()>& mustStop) {
  if (FindProfileFault(profileFile).empty()) {
    return ProfileState::kUsable;
  }
  for (const Deadline second(kSecondLook); second.Left() > Deadline::Clock::duration::zero();) {
    if (mustStop()) {
      return ProfileState::kInterrupted;
    }
    std::this_thread::sleep_for(kStopInterval);
  }
  return IsFaultless(FindProfileFault(profileFile)) ? ProfileState::kUsableNow
                                                    : ProfileState::kUnusable;
}

bool IsCommandUsable(const VelathumbCommand& command) {
  const int error = CheckAccess(command.path, FileAccess::kExecute);
  if (error != 0) {
    return IsFaultless("cannot run " + command.path + ": " + std::strerror(error));
  }
  // Signals are not handled yet: they end the program.
  const auto mustStop = [] { return false; };
  return CheckProfileUse(command.profileFile, mustStop) != ProfileState::kUnusable;
}

}  // namespace vela
