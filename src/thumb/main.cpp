// velathumb PROFILE-FILE [R:]DIRECTORY...
//
// Makes the missing thumbnails of the photos in each directory, with R: also below it.

#include <csignal>
#include <cstring>
#include <string>

#include "platform/system_rules.h"
#include "posix/files.h"
#include "posix/processes.h"
#include "posix/truncated_text.h"
#include "thumb/velathumb.h"

using namespace vela;

namespace {

bool IsTree(const char* argument) {
  return std::strncmp(argument, kTreePrefix, std::strlen(kTreePrefix)) == 0;
}

/// Returns the directory of an argument with the tree prefix, empty when it names none. The
/// directory ends at the next colon.
std::string TreeDirectory(std::string argument) {
  char* rest = nullptr;
  strtok_r(argument.data(), ":", &rest);
  const char* directory = strtok_r(nullptr, ":", &rest);
  return directory == nullptr ? std::string() : Truncated(directory);
}

void RunArgument(const char* argument, const std::string& profileFile) {
  if (IsTree(argument)) {
    const std::string directory = TreeDirectory(argument);
    if (!directory.empty()) {
      RunDirectoryTree(directory, profileFile);
    }
    return;
  }
  RunDirectoryJob(Truncated(argument), profileFile);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 3) {
    return 1;
  }
  ReserveStandardDescriptors();
  CreateFilesWithExactModes();
  KillThumbProcesses();
  std::signal(SIGTERM, OnSigTerm);
  const std::string profileFile = Truncated(argv[1]);
  const std::string pidFile = CreatePidFile();
  for (int i = 2; i < argc; ++i) {
    RunArgument(argv[i], profileFile);
  }
  RemoveFile(pidFile);
  return 0;
}
