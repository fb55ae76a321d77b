#include "storage/directory_tree.h"

#include <ftw.h>

#include <exception>

#include "platform/velaindex.h"

namespace vela {

namespace {

constexpr int kWalkDescriptors = 100;

/// A walk in progress. An exception must not pass through the C library.
struct Walk {
  const DirectoryVisitor& visit;
  std::exception_ptr failure;
};

/// The C library's walk passes no user pointer to its callback.
thread_local Walk* t_walk = nullptr;

int VisitEntry(const char* path, const struct stat* /*status*/, int typeFlag, struct FTW* place) {
  const bool isDirectory = typeFlag == FTW_D || typeFlag == FTW_DNR;
  if (!isDirectory || EntryNameShouldIndex(path + place->base) != 1) {
    return FTW_SKIP_SUBTREE;
  }
  try {
    t_walk->visit(path, typeFlag == FTW_D);
    return FTW_CONTINUE;
  } catch (...) {
    t_walk->failure = std::current_exception();
    return FTW_STOP;
  }
}

}  // namespace

int ForEachIndexedDirectory(const char* root, const DirectoryVisitor& visit) {
  Walk walk = {visit, nullptr};
  t_walk = &walk;
  const int result = nftw(root, VisitEntry, kWalkDescriptors, FTW_ACTIONRETVAL | FTW_MOUNT);
  t_walk = nullptr;
  if (walk.failure) {
    std::rethrow_exception(walk.failure);
  }
  return result;
}

}  // namespace vela
