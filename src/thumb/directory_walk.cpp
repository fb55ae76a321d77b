#include "thumb/directory_walk.h"

#include <cstdio>

#include "platform/velaindex.h"
#include "posix/files.h"
#include "profiles/thumbnail_profile.h"
#include "thumb/directory_pass.h"

using namespace vela;

namespace {

constexpr int kWalkDescriptors = 100;

/// The C library's walk passes no user pointer to its callback.
std::string g_profile_path;

}  // namespace

void RunDirectoryJob(const std::string& dirPath, const std::string& profileFilePath) {
  ThumbnailProfileList profiles;
  if (!ExamineFile(dirPath) || !ExamineFile(profileFilePath)) {
    return;
  }
  if (IndexIsPathSupportEAWrite(dirPath.c_str()) == 0) {
    return;
  }
  if (ParseThumbnailProfiles(profiles, profileFilePath, dirPath) == 0) {
    std::fprintf(stderr, "Failed to parse %s", profileFilePath.c_str());
    return;
  }
  CreateDirectoryThumbs({dirPath, profiles});
}

int RecursiveDirCallback(const char* path, const struct stat* /*status*/, int typeFlag,
                         struct FTW* walk) {
  if (typeFlag != FTW_D) {
    return FTW_SKIP_SUBTREE;
  }
  if (EntryNameShouldIndex(path + walk->base) == 0) {
    return FTW_SKIP_SUBTREE;
  }
  RunDirectoryJob(path, g_profile_path);
  return FTW_CONTINUE;
}

namespace vela {

void RunDirectoryTree(const std::string& dirPath, const std::string& profileFilePath) {
  g_profile_path = profileFilePath;
  nftw(dirPath.c_str(), RecursiveDirCallback, kWalkDescriptors, FTW_ACTIONRETVAL | FTW_MOUNT);
}

}  // namespace vela
