#include "command_check.h"

#include <cstring>

#include "posix/files.h"
#include "posix/service_log.h"
#include "profiles/thumbnail_profile.h"

namespace vela {

namespace {

/// Returns why velathumb would make no thumbnail with this profile file, empty when it would.
std::string FindProfileFault(const std::string& profileFile) {
  const int error = CheckAccess(profileFile, FileAccess::kRead);
  if (error != 0) {
    return "cannot read the profile " + profileFile + ": " + std::strerror(error);
  }
  ThumbnailProfileList profiles;
  if (ParseThumbnailProfiles(profiles, profileFile, "/") == 0) {
    return "cannot parse the profile " + profileFile;
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

bool IsProfileUsable(const std::string& profileFile) {
  return IsFaultless(FindProfileFault(profileFile));
}

bool IsCommandUsable(const VelathumbCommand& command) {
  const int error = CheckAccess(command.path, FileAccess::kExecute);
  if (error != 0) {
    return IsFaultless("cannot run " + command.path + ": " + std::strerror(error));
  }
  return IsProfileUsable(command.profileFile);
}

}  // namespace vela
