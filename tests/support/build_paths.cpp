#include "support/build_paths.h"

#include <sys/stat.h>

#include "support/sandbox.h"

namespace vela_test {

std::string VelathumbPath() {
  return BuiltPath(VELATHUMB_FILE);
}

std::string StubToolPath() {
  return BuiltPath(STUB_TOOL_FILE);
}

std::string OwnConverterPath() {
  return BuiltPath(OWN_CONVERTER_FILE);
}

std::string SourceDirectory() {
  return kSourcePlace;
}

std::string SharedMediaDirectory() {
  const std::string path = HostPath(SHARED_MEDIA_DIRECTORY);
  struct stat status {};
  return stat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode) ? path : std::string();
}

}  // namespace vela_test
