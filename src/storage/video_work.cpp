// Videos that need work: a single one, those of a tree, those of a queue.

#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "platform/velaindex.h"
#include "posix/directory_entries.h"
#include "posix/files.h"
#include "posix/log.h"
#include "posix/truncated_text.h"
#include "storage/creation_queue.h"
#include "storage/log_source.h"
#include "storage/velamk_thumb_status.h"
#include "storage/velamk_util.h"
#include "storage/video_level.h"

using namespace vela;

namespace {

/// Longer paths leave no room for the names of derived files.
constexpr size_t kLongestVideoPath = 4066;

bool AreThumbsMissing(const char* path, int32_t sizeMap) {
  return sizeMap > 0 && CheckEAThumbs(path, sizeMap) == 0;
}

/// Reads the names of all entries that are indexed, so that no descriptor stays open while a
/// subdirectory is read. Returns false on failure, which is logged.
bool ListEntries(const char* dir, std::vector<std::string>& names) {
  if (IsDirExist(dir) == 0) {
    LogError(kStatusLogSource, 332, "[Error] dir doesn't exist: " + LogText(dir));
    return false;
  }
  DirectoryEntries entries(dir);
  if (!entries.IsOpen()) {
    LogError(kStatusLogSource, 338, "[Error] opendir: " + LogText(dir));
    return false;
  }
  while (const char* name = entries.NextName()) {
    if (EntryNameShouldIndex(name) == 1) {
      names.emplace_back(name);
    }
  }
  return true;
}

/// Counts the work in a tree. Remembers the directories from the root down to the current one, so
/// that a link back to one of them does not cause an endless loop.
class VideoTree {
 public:
  int CountWork(const char* dir);

 private:
  std::vector<FileIdentity> ancestors_;
};

int VideoTree::CountWork(const char* dir) {
  const auto status = ExamineFile(dir);
  const FileIdentity identity = status ? status->identity : FileIdentity{};
  if (status && std::find(ancestors_.begin(), ancestors_.end(), identity) != ancestors_.end()) {
    return 0;
  }
  ancestors_.push_back(identity);
  int below = 0;
  int work = 0;
  ReadVideoLevel(
      dir, [&](const std::string& subdirectory) { below += CountWork(subdirectory.c_str()); },
      work);
  ancestors_.pop_back();
  return work + below;
}

/// Returns the directory of a tree entry: the text between its first colon and the next.
std::string TreeOf(const std::string& entry) {
  const size_t begin = entry.find(':') + 1;
  return entry.substr(begin, entry.find(':', begin) - begin);
}

int CountEntryWork(const std::string& entry) {
  if (IsTreeEntry(entry)) {
    return CountVideoWork(TreeOf(entry).c_str());
  }
  return IsVideoWorkNeeded(entry.c_str());
}

}  // namespace

int IsVideoWorkNeeded(const char* path) {
  if (path == nullptr || IsFileExist(path) == 0 || !BlVELAIndexIsVideoOnWebFile(path)) {
    return 0;
  }
  if (std::strlen(path) > kLongestVideoPath) {
    LogError(kStatusLogSource, 295,
             "[Error] path is too long and can't create thumbnail: " + LogText(path));
    return 0;
  }
  int32_t sizeMap = 0;
  if (VELAIDX_GetThumbSizeMap(path, THUMB_TYPE_VIDEO, &sizeMap) < 0) {
    LogError(kStatusLogSource, 301, "[Error] get thumb size map: " + LogText(path));
    return 0;
  }
  if (AreThumbsMissing(path, sizeMap)) {
    return 1;
  }
  return VELAIDX_IsVideoNeedConvert(path) == 1 && IsVideoConverted(path) == 0 ? 1 : 0;
}

namespace vela {

bool ReadVideoLevel(const char* dir, const SubdirectoryVisitor& onSubdirectory, int& work) {
  work = 0;
  std::vector<std::string> names;
  if (!ListEntries(dir, names)) {
    return false;
  }
  // Kept for the whole level on purpose: videos listed after a queued one do not count.
  bool seenQueued = false;
  for (const std::string& name : names) {
    const std::string path = JoinPath(dir, name);
    if (IsDirExist(path.c_str()) != 0) {
      onSubdirectory(path);
    } else if (IsVideoWorkNeeded(path.c_str()) == 1) {
      seenQueued = IsQueued(kVideoQueue, path.c_str()) || seenQueued;
      work += seenQueued ? 0 : 1;
    }
  }
  return true;
}

}  // namespace vela

int CountVideoWork(const char* dir) {
  return VideoTree().CountWork(dir);
}

int CountVideoQueueWork(const char* queueFile) {
  if (IsFileExist(queueFile) == 0) {
    return 0;
  }
  const bool isMainQueue = std::strcmp(queueFile, kVideoQueue.file) == 0;
  int count = 0;
  const QueueRead read = ForEachQueueEntry(queueFile, [&](const std::string& entry) {
    if (!isMainQueue || !HasQueueLine(kVideoQueue.tempFile, entry.c_str())) {
      count += CountEntryWork(entry);
    }
  });
  if (read == QueueRead::kNotOpened) {
    LogError(kStatusLogSource, 416, "[Error] fopen: " + LogText(queueFile));
  }
  return count;
}
