#include "storage/directory_tree.h"

#include <ftw.h>

#include "platform/velaindex.h"

namespace {

constexpr int kWalkDescriptors = 100;

/// The walk hands its callback no pointer of the caller's.
thread_local const DirectoryVisitor* t_visit = nullptr;

int VisitEntry(const char* path, const struct stat* /*status*/, int typeFlag, struct FTW* walk) {
  const bool isDirectory = typeFlag == FTW_D || typeFlag == FTW_DNR;
  if (!isDirectory || EntryNameShouldIndex(path + walk->base) == 0) {
    return FTW_SKIP_SUBTREE;
  }
  (*t_visit)(path, typeFlag == FTW_D);
  return FTW_CONTINUE;
}

}  // namespace

int ForEachIndexedDirectory(const char* root, const DirectoryVisitor& visit) {
  t_visit = &visit;
  const int result = nftw(root, VisitEntry, kWalkDescriptors, FTW_ACTIONRETVAL | FTW_MOUNT);
  t_visit = nullptr;
  return result;
}
