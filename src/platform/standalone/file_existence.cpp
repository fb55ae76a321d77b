#include <optional>

#include "platform/velaindex.h"
#include "posix/files.h"

int IsFileExist(const char* path, int regularOnly) {
  if (path == nullptr) {
    return 0;
  }
  const std::optional<vela::FileStatus> status = vela::ExamineFile(path);
  return status && (regularOnly == 0 || status->isRegular) ? 1 : 0;
}

int IsDirExist(const char* path) {
  if (path == nullptr) {
    return 0;
  }
  const std::optional<vela::FileStatus> status = vela::ExamineFile(path);
  return status && status->isDirectory ? 1 : 0;
}
