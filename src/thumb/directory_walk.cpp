#include "thumb/directory_walk.h"

#include <cstdio>

#include "platform/velaindex.h"
#include "posix/files.h"
#include "posix/identity.h"
#include "posix/tree_walk.h"
#include "profiles/thumbnail_profile.h"
#include "thumb/directory_pass.h"
#include "thumb/work_as_owner.h"

using namespace vela;

namespace {

/// The step of the walk has no parameter for it.
std::string g_profile_path;

bool ReadProfiles(ThumbnailProfileList& profiles, const std::string& file, const std::string& dir) {
  const OwnIdentity own;
  return ParseThumbnailProfiles(profiles, file, dir) != 0;
}

}  // namespace

void RunDirectoryJob(const std::string& dirPath, const std::string& profileFilePath) {
  ThumbnailProfileList profiles;
  if (!ExamineFile(dirPath) || !ExamineFile(profileFilePath)) {
    return;
  }
  const WorkAsOwner owner(dirPath);
  if (!owner.MayWork() || IndexIsPathSupportEAWrite(dirPath.c_str()) == 0) {
    return;
  }
  if (!ReadProfiles(profiles, profileFilePath, dirPath)) {
    std::fprintf(stderr, "Failed to parse %s", profileFilePath.c_str());
    return;
  }
  CreateDirectoryThumbs({dirPath, profiles});
}

int RecursiveDirCallback(const char* path, const struct stat* /*status*/, int typeFlag,
                         struct FTW* walk) {
  if (path == nullptr || walk == nullptr || typeFlag != FTW_D) {
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
