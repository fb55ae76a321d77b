#include "thumb/file_helpers.h"

#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <string_view>

#include "posix/glob_matches.h"
#include "thumb/log_source.h"

using vela::GlobMatches;
using vela::kLogSource;

int checkCreateDir(const std::string& path) {
  struct stat status = {};
  if (stat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode)) {
    return 1;
  }
  if (mkdir(path.c_str(), 0777) == 0 || errno == EEXIST) {
    return 1;
  }
  if (errno != ENOENT) {
    syslog(LOG_ERR, "%s:%d %s: %s(%d) - mkdir(%s, 0777 ), errno: %d\n", kLogSource, 447, kLogSource,
           "checkCreateDir", 447, path.c_str(), errno);
  }
  return 0;
}

int RemoveFilesByPattern(const std::string& pattern) {
  int result = 0;
  for (const char* path : GlobMatches(pattern)) {
    if (unlink(path) != 0) {
      result = -1;
    }
  }
  return result;
}
