// Thumbnail status of a whole tree.
#include <cstring>

#include "platform/velaindex.h"
#include "posix/tree_walk.h"
#include "storage/creation_queue.h"
#include "storage/velamk_thumb_status.h"

using namespace vela;

namespace {

const char* LastComponent(const char* path) {
  const char* slash = std::strrchr(path, '/');
  return slash == nullptr ? path : slash + 1;
}

}  // namespace

int g_incomplete_photo_num = 0;
int g_incomplete_thumb_num = 0;

int GetDirThumbStatusRecursive_Callback(const char* path, const struct stat* /*status*/,
                                        int typeFlag, struct FTW* /*walk*/) {
  if (path == nullptr || typeFlag != FTW_D || EntryNameShouldIndex(LastComponent(path)) != 1) {
    return FTW_SKIP_SUBTREE;
  }
  if (IsQueued(kPhotoQueue, path)) {
    return FTW_CONTINUE;
  }
  int photos = 0;
  int thumbs = 0;
  GetDirThumbStatus(path, &photos, &thumbs);
  g_incomplete_photo_num += photos;
  g_incomplete_thumb_num += thumbs;
  return FTW_CONTINUE;
}

int GetDirThumbStatusRecursive(const char* dir, int* photosOut, int* thumbsOut) {
  g_incomplete_photo_num = 0;
  g_incomplete_thumb_num = 0;
  const int result = dir == nullptr ? -1 : WalkTree(dir, GetDirThumbStatusRecursive_Callback);
  *photosOut = g_incomplete_photo_num;
  *thumbsOut = g_incomplete_thumb_num;
  return result;
}
