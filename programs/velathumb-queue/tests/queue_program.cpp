#include "queue_program.h"

#include "support/build_paths.h"
#include "support/sandbox.h"

namespace vela_test {

std::string QueueProgramPath() {
  return HostPath(VELATHUMB_QUEUE_FILE);
}

std::vector<std::string> QueueArguments(const std::string& profileFile,
                                        const std::vector<std::string>& more) {
  std::vector<std::string> arguments = {"--velathumb", VelathumbPath(), "--profile", profileFile};
  arguments.insert(arguments.end(), more.begin(), more.end());
  return arguments;
}

}  // namespace vela_test
