#include "storage/directory_tree.h"

#include "platform/velaindex.h"
#include "posix/tree_walk.h"

namespace vela {

int ForEachIndexedDirectory(const char* root, const DirectoryVisitor& visit,
                            const std::function<bool()>& shouldStop) {
  const int result = WalkTree(
      root,
      [&](const char* path, const struct stat* /*status*/, int typeFlag, struct FTW* place) -> int {
        if (shouldStop && shouldStop()) {
          return FTW_STOP;
        }
        const bool isDirectory = typeFlag == FTW_D || typeFlag == FTW_DNR;
        if (!isDirectory || EntryNameShouldIndex(path + place->base) != 1) {
          return FTW_SKIP_SUBTREE;
        }
        visit(path, typeFlag == FTW_D);
        return FTW_CONTINUE;
      });
  return result == FTW_STOP ? 0 : result;
}

}  // namespace vela
