#include "imagemagick/image_magick_policy.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string>

#include "posix/files.h"
#include "process/failure_report.h"

namespace vela {

namespace {

/// Lead to other configuration or code, or tell ImageMagick to follow other rules.
constexpr const char* kOtherConfiguration[] = {"MAGICK_HOME", "MAGICK_CODER_MODULE_PATH",
                                               "MAGICK_CODER_FILTER_PATH",
                                               "MAGICK_FILTER_MODULE_PATH"};

}  // namespace

bool UsePolicy() {
  const std::string directory = kPolicyDirectory;
  const std::string last = directory + "/last";
  for (const std::string& file : {directory + "/policy.xml", last + "/ImageMagick/policy.xml"}) {
    // Opened because ImageMagick would ignore a policy that may not be read.
    if (!OpenForReading(file).IsOpen()) {
      ReportFailure("%s: %s, so ImageMagick is not used", file.c_str(), std::strerror(errno));
      return false;
    }
  }
  for (const char* const variable : kOtherConfiguration) {
    unsetenv(variable);
  }
  setenv("MAGICK_CONFIGURE_PATH", kPolicyDirectory, 1);
  setenv("XDG_CONFIG_HOME", last.c_str(), 1);
  // Its configuration would be read after the policy.
  setenv("HOME", "/", 1);
  return true;
}

}  // namespace vela
