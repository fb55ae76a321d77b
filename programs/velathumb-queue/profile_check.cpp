#include "profile_check.h"

#include "platform/velaindex.h"
#include "profiles/thumbnail_profile.h"
#include "run_log.h"

namespace vela {

bool IsProfileUsable(const std::string& profileFile) {
  ThumbnailProfileList profiles;
  if (IsFileExist(profileFile.c_str()) != 0 &&
      ParseThumbnailProfiles(profiles, profileFile, "/") != 0 &&
      GetProfileCount(profiles, kAllPhases) > 0) {
    return true;
  }
  WriteLog(LogLevel::kError, "no profile, or none with a thumbnail to make: " + profileFile);
  return false;
}

}  // namespace vela
