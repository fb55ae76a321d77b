#include "thumb/directory_walk.h"

#include <cstdio>

#include "platform/velaindex.h"
#include "posix/files.h"
#include "profiles/thumbnail_profile.h"
#include "thumb/directory_pass.h"

using namespace vela;

namespace {

/// The step of the walk has no parameter for it.
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
  WalkTree(dirPath.c_str(), RecursiveDirCallback);
}

}  // namespace vela
