#include "storage/directory_status.h"

#include <syslog.h>

#include "platform/velaindex.h"
#include "storage/directory_entries.h"
#include "storage/status_log_source.h"
#include "storage/velamk_thumb_status.h"

using vela::DirectoryEntries;
using vela::DirectoryEntryPath;
using vela::kStatusLogSource;
using vela::PhotoThumbStates;
using vela::ReadPhotoThumbStates;

namespace {

/// Returns the size map of all photos of the directory, -1 to ask for each photo's own.
int32_t DirectorySizeMap(const char* dir) {
  int32_t sizeMap = 0;
  return VELAIDX_GetDirThumbSizeMap(dir, THUMB_TYPE_PHOTO, &sizeMap) < 0 ? -1 : sizeMap;
}

}  // namespace

namespace vela {

bool ForEachPhotoStatus(const char* dir, const PhotoStatusVisitor& visit) {
  if (IsDirExist(dir) == 0) {
    return false;
  }
  DirectoryEntries entries(dir);
  if (!entries.IsOpen()) {
    syslog(LOG_ERR, "%s:%d [Error] opendir: %s", kStatusLogSource, 153, dir);
    return false;
  }
  const int32_t sizeMap = DirectorySizeMap(dir);
  while (const char* name = entries.NextName()) {
    if (EntryNameShouldIndex(name) != 1) {
      continue;
    }
    const std::string path = DirectoryEntryPath(dir, name);
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
  vela::ForEachPhotoStatus(dir, [&](const std::string&, const PhotoThumbStates& photo) {
    const int missing = photo.Missing();
    *photosOut += missing >= 1 ? 1 : 0;
    *thumbsOut += missing;
  });
}
