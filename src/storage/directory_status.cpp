#include "storage/directory_status.h"

#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "posix/directory_entries.h"
#include "posix/folder.h"
#include "posix/log.h"
#include "posix/truncated_text.h"
#include "storage/log_source.h"
#include "storage/velamk_thumb_status.h"

using namespace vela;

namespace {

/// Returns the size map of all photos of the directory, -1 to ask for each photo's own.
int32_t DirectorySizeMap(const char* dir) {
  int32_t sizeMap = 0;
  return VELAIDX_GetDirThumbSizeMap(dir, THUMB_TYPE_PHOTO, &sizeMap) < 0 ? -1 : sizeMap;
}

}  // namespace

namespace vela {

bool ForEachPhotoStatus(const char* dir, const PhotoStatusVisitor& visit,
                        const std::function<bool()>& shouldStop) {
  if (IsDirExist(dir) == 0) {
    return false;
  }
  DirectoryEntries entries(dir);
  if (!entries.IsOpen()) {
    LogError(kStatusLogSource, 153, "[Error] opendir: " + LogText(dir));
    return false;
  }
  const HeldFolder directory(dir);
  const HeldFolder metadataRoot(JoinPath(dir, kMetadataDirName));
  const int32_t sizeMap = DirectorySizeMap(dir);
  while (const char* name = entries.NextName()) {
    if (shouldStop && shouldStop()) {
      break;
    }
    if (EntryNameShouldIndex(name) != 1) {
      continue;
    }
    const std::string path = JoinPath(dir, name);
    if (BlVELAIndexIsPhotoOnWebConvertFile(path.c_str())) {
      visit(path, ReadPhotoThumbStates(path.c_str(), sizeMap));
    }
  }
  return true;
}

}  // namespace vela

void GetDirThumbStatus(const char* dir, int* photosOut, int* thumbsOut) {
  *photosOut = 0;
  *thumbsOut = 0;
  ForEachPhotoStatus(dir, [&](const std::string&, const PhotoThumbStates& photo) {
    const int missing = photo.Missing();
    *photosOut += missing >= 1 ? 1 : 0;
    *thumbsOut += missing;
  });
}

int CountDirEntries(const char* path) {
  if (IsDirExist(path) == 0) {
    return 0;
  }
  DirectoryEntries entries(path);
  if (!entries.IsOpen()) {
    return 0;
  }
  int count = 0;
  while (entries.NextName() != nullptr) {
    ++count;
  }
  return count;
}
