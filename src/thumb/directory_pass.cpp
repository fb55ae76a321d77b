#include "thumb/directory_pass.h"

#include <sys/stat.h>
#include <syslog.h>

#include <algorithm>
#include <cstring>
#include <ctime>

#include "platform/velaindex.h"
#include "storage/creation_queue.h"
#include "storage/directory_entries.h"
#include "thumb/directory_lock.h"
#include "thumb/file_helpers.h"
#include "thumb/log_source.h"
#include "thumb/photo_pass.h"

using vela::DirectoryEntries;
using vela::DirectoryLock;
using vela::kLogSource;
using vela::kPhotoQueue;
using vela::PhotoEnd;
using vela::PhotoPass;

namespace {

bool IsPhotoName(const char* name) {
  if (std::strcmp(name, ".") == 0 || std::strcmp(name, "..") == 0) {
    return false;
  }
  // Other systems keep a file's attributes beside it under its name with this prefix.
  if (std::strncmp(name, "._", 2) == 0) {
    return false;
  }
  return BlVELAIndexIsPhotoOnWebConvertFile(name);
}

bool IsRegularFile(const std::string& path) {
  struct stat status = {};
  if (stat(path.c_str(), &status) != 0) {
    syslog(LOG_ERR, "%s:%d [Error] stat: %s", kLogSource, 416, path.c_str());
    return false;
  }
  return S_ISREG(status.st_mode);
}

/// Takes the photos one after the other. Returns true when the directory needs a later run.
bool MakePhotos(const DirectoryJob& job, const std::string& metadataRoot,
                const std::vector<std::string>& names, time_t passStart) {
  bool queue = false;
  for (const std::string& name : names) {
    switch (PhotoPass(job, metadataRoot, name, passStart).Run()) {
      case PhotoEnd::kNextPhoto:
        break;
      case PhotoEnd::kNextPhotoQueue:
        queue = true;
        break;
      case PhotoEnd::kStopPass:
        return queue;
    }
  }
  return queue;
}

void QueueDirectory(const std::string& dir) {
  if (WriteIndexQueue(dir.c_str(), kPhotoQueue.file) != 0) {
    syslog(LOG_ERR, "%s:%d Failed to write [%s] to thumb queue", kLogSource, 1112, dir.c_str());
  }
}

}  // namespace

std::vector<std::string> ListDirectoryPhotos(const std::string& dir) {
  std::vector<std::string> names;
  DirectoryEntries entries(dir.c_str());
  if (!entries.IsOpen()) {
    syslog(LOG_ERR, "%s:%d [Error] opendir: %s", kLogSource, 404, dir.c_str());
    return names;
  }
  while (const char* name = entries.NextName()) {
    if (IsPhotoName(name) && IsRegularFile(dir + "/" + name)) {
      names.emplace_back(name);
    }
  }
  std::sort(names.begin(), names.end());
  return names;
}

void CreateDirectoryThumbs(const DirectoryJob& job) {
  const std::string metadataRoot = job.path + "/@eaDir";
  const std::vector<std::string> names = ListDirectoryPhotos(job.path);
  const time_t passStart = std::time(nullptr);
  if (names.empty() || checkCreateDir(metadataRoot) == 0) {
    return;
  }
  bool queue = false;
  {
    const DirectoryLock lock(metadataRoot);
    if (!lock.IsHeld()) {
      return;
    }
    queue = MakePhotos(job, metadataRoot, names, passStart);
  }
  if (queue) {
    QueueDirectory(job.path);
  }
}
