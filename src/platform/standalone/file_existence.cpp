#include <sys/stat.h>

#include "platform/velaindex.h"

int IsFileExist(const char* path, int regularOnly) {
  struct stat status;
  if (path == nullptr || stat(path, &status) != 0) return 0;
  return regularOnly == 0 || S_ISREG(status.st_mode) ? 1 : 0;
}

int IsDirExist(const char* path) {
  struct stat status;
  return path != nullptr && stat(path, &status) == 0 && S_ISDIR(status.st_mode) ? 1 : 0;
}
