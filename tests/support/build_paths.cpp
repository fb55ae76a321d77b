#include "support/build_paths.h"

#include <sys/stat.h>

#include "support/sandbox.h"

namespace vela_test {

std::string VelathumbPath() {
  return HostPath(VELATHUMB_FILE);
}

std::string StubToolPath() {
  return HostPath(STUB_TOOL_FILE);
}

std::string OwnConverterPath() {
  return HostPath(OWN_CONVERTER_FILE);
}

std::string SourceDirectory() {
  return HostPath(SOURCE_DIRECTORY);
}

std::string SharedMediaDirectory() {
  const std::string path = HostPath(SHARED_MEDIA_DIRECTORY);
  struct stat status {};
  return stat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode) ? path : std::string();
}

}  // namespace vela_test
