#include "thumb/pid_file.h"

#include <cstdlib>
#include <cstring>
#include <string>

#include "posix/truncated_text.h"

namespace vela {

long PidOfFile(const char* path) {
  std::string copy = Truncated(path, kPidPathBufferSize);
  char* rest = nullptr;
  strtok_r(copy.data(), ".", &rest);
  const char* number = strtok_r(nullptr, ".", &rest);
  return number == nullptr ? 0 : std::strtol(number, nullptr, 10);
}

}  // namespace vela
