#include "thumb/directory_pass.h"

#include <algorithm>
#include <cstring>
#include <ctime>

#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "posix/directory_entries.h"
#include "posix/files.h"
#include "posix/folder.h"
#include "posix/identity.h"
#include "posix/log.h"
#include "storage/creation_queue.h"
#include "storage/file_helpers.h"
#include "storage/log_source.h"
#include "storage/photo_folder.h"
#include "storage/unfinished_directories.h"
#include "thumb/directory_lock.h"
#include "thumb/photo_pass.h"

using namespace vela;

namespace {

bool IsPhotoName(const char* name) {
  if (std::strcmp(name, ".") == 0 || std::strcmp(name, "..") == 0) {
    return false;
  }
  // Other systems store a file's attributes next to it, under its name with this prefix.
  if (std::strncmp(name, "._", 2) == 0) {
    return false;
  }
  return BlVELAIndexIsPhotoOnWebConvertFile(name);
}

bool IsPhotoFile(const std::string& path) {
  const auto status = ExamineFile(path);
  if (!status) {
    LogError(kProgramLogSource, 416, "[Error] stat: " + path);
    return false;
  }
  return status->isRegular;
}

/// Removes what an interrupted run has left in the folders of photos that no longer exist.
void CleanOtherFolders(const std::string& metadataRoot, const std::vector<std::string>& names) {
  DirectoryEntries entries(metadataRoot);
  while (const char* name = entries.IsOpen() ? entries.NextName() : nullptr) {
    const bool isFolder = std::strcmp(name, ".") != 0 && std::strcmp(name, "..") != 0;
    if (isFolder && !std::binary_search(names.begin(), names.end(), name)) {
      RemoveLeftovers(metadataRoot + "/" + name);
    }
  }
}

/// Processes the photos one after the other. Returns true when the directory needs a later run.
bool MakePhotos(const DirectoryJob& job, const std::string& metadataRoot,
                const std::vector<std::string>& names, time_t passStart) {
  bool queue = false;
  bool isStopped = false;
  for (const std::string& name : names) {
    if (isStopped) {
      // What an interrupted run has left may be what fills the volume.
      RemoveLeftovers(metadataRoot + "/" + name);
      continue;
    }
    const PhotoEnd end = PhotoPass(job, metadataRoot, name, passStart).Run();
    queue = queue || end == PhotoEnd::kNextPhotoQueue;
    isStopped = end == PhotoEnd::kStopPass;
  }
  return queue;
}

void QueueDirectory(const std::string& dir) {
  const OwnIdentity own;
  if (WriteIndexQueue(dir.c_str(), kPhotoQueue.file) != 0) {
    LogError(kProgramLogSource, 1112, "Failed to write [" + dir + "] to thumb queue");
    NoteUnfinishedDirectory(dir, UnfinishedReason::kNotQueued);
  }
}

}  // namespace

std::vector<std::string> ListDirectoryPhotos(const std::string& dir) {
  std::vector<std::string> names;
  DirectoryEntries entries(dir);
  if (!entries.IsOpen()) {
    LogError(kProgramLogSource, 404, "[Error] opendir: " + dir);
    return names;
  }
  while (const char* name = entries.NextName()) {
    if (IsPhotoName(name) && IsPhotoFile(dir + "/" + name)) {
      names.emplace_back(name);
    }
  }
  std::sort(names.begin(), names.end());
  return names;
}

void CreateDirectoryThumbs(const DirectoryJob& job) {
  const HeldFolder directory(job.path);
  const std::string metadataRoot = job.path + "/" + kMetadataDirName;
  const std::vector<std::string> names = ListDirectoryPhotos(job.path);
  const time_t passStart = std::time(nullptr);
  if (names.empty() || checkCreateDir(metadataRoot) == 0) {
    return;
  }
  bool queue = false;
  {
    const HeldFolder root(metadataRoot);
    const DirectoryLock lock(metadataRoot);
    if (lock.IsRefused()) {
      const OwnIdentity own;
      NoteUnfinishedDirectory(job.path, UnfinishedReason::kLocked);
    }
    if (!lock.IsHeld()) {
      return;
    }
    CleanOtherFolders(metadataRoot, names);
    queue = MakePhotos(job, metadataRoot, names, passStart);
  }
  if (queue) {
    QueueDirectory(job.path);
  }
}
