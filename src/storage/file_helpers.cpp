#include "storage/file_helpers.h"

#include <cerrno>

#include "posix/folder.h"
#include "posix/glob_matches.h"
#include "posix/log.h"
#include "storage/log_source.h"

using namespace vela;

namespace {

constexpr unsigned kDirectoryMode = 0777;

}  // namespace

int checkCreateDir(const std::string& path) {
  if (IsFolderHeld(path)) {
    return 1;
  }
  const FolderEntry directory(path);
  struct stat status = {};
  if (directory.Examine(status) == 0 && IsDirectoryMode(status.st_mode)) {
    return 1;
  }
  const int error = directory.CreateDirectory(kDirectoryMode);
  if (error == 0 || error == EEXIST) {
    return 1;
  }
  if (error != ENOENT) {
    LogError(kProgramLogSource, 447,
             std::string(kProgramLogSource) + ": checkCreateDir(447) - mkdir(" + path +
                 ", 0777 ), errno: " + std::to_string(error) + "\n");
  }
  return 0;
}

int RemoveFilesByPattern(const std::string& pattern) {
  int result = 0;
  for (const char* path : GlobMatches(pattern)) {
    if (RemoveEntry(path) != 0) {
      result = -1;
    }
  }
  return result;
}
