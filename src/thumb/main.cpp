// velathumb PROFILE-FILE [R:]DIRECTORY...
//
// Makes the missing thumbnails of the photos in each directory, with R: also below it.

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <cstring>
#include <string>

#include "posix/cut_text.h"
#include "thumb/velathumb.h"

using vela::CutText;
using vela::RunDirectoryTree;

namespace {

constexpr char kTreePrefix[] = "R:";

bool IsTree(const char* argument) {
  return std::strncmp(argument, kTreePrefix, 2) == 0;
}

/// Returns the directory of an argument with the tree prefix, empty when it names none. The
/// directory ends at the next colon.
std::string TreeDirectory(std::string argument) {
  char* rest = nullptr;
  strtok_r(argument.data(), ":", &rest);
  const char* directory = strtok_r(nullptr, ":", &rest);
  return directory == nullptr ? std::string() : CutText(directory);
}

void RunArgument(const char* argument, const std::string& profileFile) {
  if (IsTree(argument)) {
    const std::string directory = TreeDirectory(argument);
    if (!directory.empty()) {
      RunDirectoryTree(directory, profileFile);
    }
    return;
  }
  RunDirectoryJob(CutText(argument), profileFile);
}

/// Makes sure that no file or lock takes the place of a standard descriptor that the caller closed.
void HoldStandardDescriptors() {
  int descriptor = 0;
  do {
    descriptor = open("/dev/null", O_RDWR);
  } while (descriptor >= 0 && descriptor <= STDERR_FILENO);
  if (descriptor > STDERR_FILENO) {
    close(descriptor);
  }
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 3) {
    return 1;
  }
  HoldStandardDescriptors();
  umask(0);
  KillThumbProcesses();
  std::signal(SIGTERM, OnSigTerm);
  const std::string profileFile = CutText(argv[1]);
  const std::string pidFile = CreatePidFile();
  for (int i = 2; i < argc; ++i) {
    RunArgument(argv[i], profileFile);
  }
  unlink(pidFile.c_str());
  return 0;
}
