#include "additions.h"

#include <cerrno>
#include <cstring>

#include "entry_check.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/accounts.h"
#include "posix/files.h"
#include "posix/service_log.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

/// Returns 0 or an errno value.
int AppendAll(const std::vector<std::string>& entries) {
  for (const std::string& entry : entries) {
    if (WriteIndexQueue(entry.c_str(), kPhotoQueue.file) != 0) {
      return VLIBCErrGet();
    }
  }
  // The runner may have taken the queue meanwhile.
  const int error = SyncFile(kPhotoQueue.file);
  return error == 0 || error == ENOENT ? SyncDirectoryOf(kPhotoQueue.file) : error;
}

}  // namespace

bool CheckAdditions(std::vector<std::string>& entries) {
  for (std::string& entry : entries) {
    const std::string fault = CheckAddition(entry);
    if (!fault.empty()) {
      WriteLog(LogLevel::kError, "cannot add " + entry + ": " + fault);
      return false;
    }
  }
  return true;
}

bool AppendEntries(const std::vector<std::string>& entries) {
  const int error = entries.empty() ? 0 : AppendAll(entries);
  if (error != 0) {
    WriteLog(LogLevel::kError,
             DescribeRefusal("add to the queue " + std::string(kPhotoQueue.file), error));
  }
  return error == 0;
}

std::string DescribeAdditions(const std::vector<std::string>& entries) {
  return entries.size() == 1 ? "queued " + entries.front()
                             : "queued " + std::to_string(entries.size()) + " entries";
}

std::string DescribeRefusal(const std::string& what, int error) {
  const bool isForbidden = error == EACCES || error == EPERM;
  if (isForbidden && EffectiveUser() != 0) {
    return "cannot " + what +
           ": only root may do that; use sudo, or run velathumb for directories of your own";
  }
  return "cannot " + what + ": " + std::strerror(error);
}

}  // namespace vela
