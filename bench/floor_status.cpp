// floor_status DIRECTORY
//
// Lists a directory and calls stat for each photo, its metadata directory and its six thumbnails,
// and does nothing else: the minimum cost of a directory whose thumbnails are up to date.

#include <dirent.h>
#include <sys/stat.h>

#include <cstdio>
#include <cstring>

namespace {

constexpr const char* kThumbs[] = {"VELAPHOTO_THUMB_S.jpg",  "VELAPHOTO_THUMB_M.jpg",
                                   "VELAPHOTO_THUMB_B.jpg",  "VELAPHOTO_THUMB_L.jpg",
                                   "VELAPHOTO_THUMB_XL.jpg", "VELAPHOTO_THUMB_SM.jpg"};

bool IsThere(const char* path) {
  struct stat status = {};
  return stat(path, &status) == 0;
}

bool ArePhotoFilesThere(const char* directory, const char* name) {
  char path[4096];
  std::snprintf(path, sizeof path, "%s/%s", directory, name);
  if (!IsThere(path)) {
    return false;
  }
  const int length = std::snprintf(path, sizeof path, "%s/@eaDir/%s", directory, name);
  if (!IsThere(path)) {
    return false;
  }
  for (const char* thumb : kThumbs) {
    std::snprintf(path + length, sizeof path - static_cast<size_t>(length), "/%s", thumb);
    if (!IsThere(path)) {
      return false;
    }
  }
  return true;
}

}  // namespace

int main(int argc, char** argv) {
  DIR* directory = argc == 2 ? opendir(argv[1]) : nullptr;
  if (directory == nullptr) {
    return 2;
  }
  while (const dirent* entry = readdir(directory)) {
    if (entry->d_name[0] != '.' && std::strcmp(entry->d_name, "@eaDir") != 0 &&
        !ArePhotoFilesThere(argv[1], entry->d_name)) {
      return 1;
    }
  }
  closedir(directory);
  return 0;
}
