#include "storage/photo_thumb_states.h"

#include <sys/stat.h>
#include <syslog.h>

#include <algorithm>
#include <string>

#include "platform/velaindex.h"
#include "posix/cut_text.h"
#include "storage/status_log_source.h"
#include "storage/thumb_age.h"
#include "storage/velamk_thumb_status.h"

namespace vela {

namespace {

constexpr int32_t kUnknownSizeMap = -1;

bool ResolveSizeMap(const char* path, int32_t& sizeMap) {
  if (sizeMap != kUnknownSizeMap) {
    return true;
  }
  if (VELAIDX_GetThumbSizeMap(path, THUMB_TYPE_PHOTO, &sizeMap) >= 0) {
    return true;
  }
  syslog(LOG_ERR, "%s:%d [Error] get thumb size map: %s", kStatusLogSource, 96, path);
  return false;
}

/// Looks at one thumbnail after the other of a photo that is examined only once.
class PhotoThumbs {
 public:
  PhotoThumbs(const char* path, const char* eaDir) : path_(path), eaDir_(eaDir) {}

  ThumbState StateOf(const EAThumbInfo& row) {
    if (IsGoodFile(row.name)) {
      return ThumbState::kPresent;
    }
    const char* name = IsEAFileExist(eaDir_.c_str(), nullptr, row.name, row.oldName);
    if (name == nullptr) {
      return ThumbState::kMissing;
    }
    return IsOutdated(name) ? ThumbState::kOutdated : ThumbState::kPresent;
  }

 private:
  /// Answers the usual case, a good thumbnail under its current name, from one look at the file.
  bool IsGoodFile(const char* name) {
    const std::string path = eaDir_ + '/' + name;
    struct stat thumb = {};
    if (path.size() >= kPathBufferSize || stat(path.c_str(), &thumb) != 0 ||
        !S_ISREG(thumb.st_mode)) {
      return false;
    }
    known_ = known_ || stat(path_, &photo_) == 0;
    return known_ && !IsDerivedFileOutdated(photo_, thumb);
  }

  bool IsOutdated(const char* name) {
    known_ = known_ || StatMediaFile(path_, photo_);
    // A photo that cannot be examined never has its thumbnails made again.
    return known_ && IsDerivedFileOutdated(photo_, DerivedFilePath(eaDir_, name));
  }

  const char* path_;
  const std::string eaDir_;
  bool known_ = false;
  struct stat photo_ = {};
};

}  // namespace

int PhotoThumbStates::Missing() const {
  int missing = 0;
  for (size_t size = 0; size < states.size(); ++size) {
    missing += IsLacking(size) ? 1 : 0;
  }
  return missing;
}

int PhotoThumbStates::Present() const {
  return static_cast<int>(std::count(states.begin(), states.end(), ThumbState::kPresent));
}

PhotoThumbStates ReadPhotoThumbStates(const char* path, int32_t sizeMap) {
  PhotoThumbStates photo;
  if (IsFileExist(path) == 0) {
    return photo;
  }
  photo.lookup = PhotoLookup::kFailed;
  char eaDir[kPathBufferSize] = "";
  if (VELAEADirPath(0, path, eaDir, sizeof eaDir) != 0) {
    syslog(LOG_ERR, "%s:%d [Error] get eadir: %s", kStatusLogSource, 89, path);
    return photo;
  }
  if (!ResolveSizeMap(path, sizeMap)) {
    return photo;
  }
  photo.lookup = PhotoLookup::kDone;
  PhotoThumbs thumbs(path, eaDir);
  for (const EAThumbInfo& row : rgEAThumbInfo) {
    if (IsThumbInSizeMap(row.name, sizeMap) != 0) {
      photo.states[static_cast<size_t>(row.size)] = thumbs.StateOf(row);
    }
  }
  return photo;
}

}  // namespace vela

void GetThumbStatus(const char* path, int* missingOut, int* presentOut, int32_t sizeMap) {
  const vela::PhotoThumbStates photo = vela::ReadPhotoThumbStates(path, sizeMap);
  *missingOut = photo.Missing();
  *presentOut = photo.Present();
}
