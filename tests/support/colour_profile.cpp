#include "support/colour_profile.h"

#include "support/environment_failure.h"

namespace vela_test {

std::string ProfileBytes(cmsHPROFILE profile) {
  cmsUInt32Number size = 0;
  cmsSaveProfileToMem(profile, nullptr, &size);
  std::string bytes(size, '\0');
  const bool made =
      profile != nullptr && size > 0 && cmsSaveProfileToMem(profile, bytes.data(), &size) != FALSE;
  cmsCloseProfile(profile);
  if (!made) {
    EnvironmentFailure("cannot make a colour profile");
  }
  return bytes;
}

}  // namespace vela_test
