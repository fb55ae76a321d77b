#include "storage/directory_tree.h"

#include "platform/velaindex.h"
#include "posix/tree_walk.h"

namespace vela {

int ForEachIndexedDirectory(const char* root, const DirectoryVisitor& visit) {
  return WalkTree(
      root,
      [&](const char* path, const struct stat* /*status*/, int typeFlag, struct FTW* place) -> int {
        const bool isDirectory = typeFlag == FTW_D || typeFlag == FTW_DNR;
        if (!isDirectory || EntryNameShouldIndex(path + place->base) != 1) {
          return FTW_SKIP_SUBTREE;
        }
        visit(path, typeFlag == FTW_D);
        return FTW_CONTINUE;
      });
}

}  // namespace vela
