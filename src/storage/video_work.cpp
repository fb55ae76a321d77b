// Videos that need work: one, those of a tree, those of a queue.
#include <sys/stat.h>
#include <syslog.h>

#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "platform/velaindex.h"
#include "storage/creation_queue.h"
#include "storage/directory_entries.h"
#include "storage/status_log_source.h"
#include "storage/velamk_thumb_status.h"
#include "storage/velamk_util.h"
#include "storage/video_level.h"

using vela::DirectoryEntries;
using vela::DirectoryEntryPath;
using vela::ForEachQueueEntry;
using vela::HasQueueLine;
using vela::IsQueued;
using vela::IsTreeEntry;
using vela::kStatusLogSource;
using vela::kVideoQueue;
using vela::QueueRead;

namespace {

/// Longer paths leave no room for the names of derived files behind them.
constexpr size_t kLongestVideoPath = 4066;

bool AreThumbsMissing(const char* path, int32_t sizeMap) {
  return sizeMap > 0 && CheckEAThumbs(path, sizeMap) == 0;
}

/// Reads the names of all entries that are indexed, so that no descriptor stays open however deep
/// a tree is. Returns false on failure, which is logged.
bool ListEntries(const char* dir, std::vector<std::string>& names) {
  if (IsDirExist(dir) == 0) {
    syslog(LOG_ERR, "%s:%d [Error] dir doesn't exist: %s", kStatusLogSource, 332, dir);
    return false;
  }
  DirectoryEntries entries(dir);
  if (!entries.IsOpen()) {
    syslog(LOG_ERR, "%s:%d [Error] opendir: %s", kStatusLogSource, 338, dir);
    return false;
  }
  while (const char* name = entries.NextName()) {
    if (EntryNameShouldIndex(name) == 1) {
      names.emplace_back(name);
    }
  }
  return true;
}

/// Counts the work in a tree. Remembers the directories that it is in, so that a link which leads
/// back into one of them does not send it round and round.
class VideoTree {
 public:
  int CountWork(const char* dir);

 private:
  struct Place {
    dev_t device;
    ino_t inode;
  };

  bool IsIn(const Place& place) const;

  std::vector<Place> way_;
};

bool VideoTree::IsIn(const Place& place) const {
  return std::any_of(way_.begin(), way_.end(), [&place](const Place& other) {
    return other.device == place.device && other.inode == place.inode;
  });
}

int VideoTree::CountWork(const char* dir) {
  struct stat status = {};
  const bool isKnown = stat(dir, &status) == 0;
  const Place place = {status.st_dev, status.st_ino};
  if (isKnown && IsIn(place)) {
    return 0;
  }
  way_.push_back(place);
  int below = 0;
  int work = 0;
  vela::ReadVideoLevel(
      dir, [&](const std::string& subdirectory) { below += CountWork(subdirectory.c_str()); },
      work);
  way_.pop_back();
  return work + below;
}

/// Returns the directory of a tree entry: what stands between its first colon and the next.
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
    syslog(LOG_ERR, "%s:%d [Error] path is too long and can't create thumbnail: %s",
           kStatusLogSource, 295, path);
    return 0;
  }
  int32_t sizeMap = 0;
  if (VELAIDX_GetThumbSizeMap(path, THUMB_TYPE_VIDEO, &sizeMap) < 0) {
    syslog(LOG_ERR, "%s:%d [Error] get thumb size map: %s", kStatusLogSource, 301, path);
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
  // Kept for the whole level on purpose: what is listed behind a waiting video does not count.
  bool seenQueued = false;
  for (const std::string& name : names) {
    const std::string path = DirectoryEntryPath(dir, name.c_str());
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
    syslog(LOG_ERR, "%s:%d [Error] fopen: %s", kStatusLogSource, 416, queueFile);
  }
  return count;
}
