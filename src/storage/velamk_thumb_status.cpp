#include "storage/velamk_thumb_status.h"

#include <sys/stat.h>
#include <syslog.h>

#include <string>

#include "platform/velaindex.h"
#include "storage/thumb_age.h"
#include "storage/thumb_size_class.h"
#include "thumb/cut_text.h"

namespace {

constexpr char kLogSource[] = "velamk_thumb_status";
constexpr int32_t kUnknownSizeMap = -1;

bool ResolveSizeMap(const char* path, int32_t& sizeMap) {
  if (sizeMap != kUnknownSizeMap) {
    return true;
  }
  if (VELAIDX_GetThumbSizeMap(path, THUMB_TYPE_PHOTO, &sizeMap) >= 0) {
    return true;
  }
  syslog(LOG_ERR, "%s:%d [Error] get thumb size map: %s", kLogSource, 96, path);
  return false;
}

/// Looks at one thumbnail after the other of a photo that is examined only once.
class PhotoThumbs {
 public:
  PhotoThumbs(const char* path, const char* eaDir) : path_(path), eaDir_(eaDir) {}

  /// Tells whether the size class has a thumbnail that is up to date.
  bool IsPresent(const EAThumbInfo& row) {
    if (IsGoodFile(row.name)) {
      return true;
    }
    const char* name = IsEAFileExist(eaDir_.c_str(), nullptr, row.name, row.oldName);
    return name != nullptr && !IsOutdated(name);
  }

 private:
  /// Answers the usual case, a good thumbnail under its current name, from one look at the file.
  bool IsGoodFile(const char* name) {
    struct stat thumb = {};
    if (stat(DerivedFilePath(eaDir_, name).c_str(), &thumb) != 0 || !S_ISREG(thumb.st_mode)) {
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

void GetThumbStatus(const char* path, int* missingOut, int* presentOut, int32_t sizeMap) {
  *missingOut = 0;
  *presentOut = 0;
  if (IsFileExist(path) == 0) {
    return;
  }
  char eaDir[kPathBufferSize] = "";
  if (VELAEADirPath(0, path, eaDir, sizeof eaDir) != 0) {
    syslog(LOG_ERR, "%s:%d [Error] get eadir: %s", kLogSource, 89, path);
    return;
  }
  if (!ResolveSizeMap(path, sizeMap)) {
    return;
  }
  PhotoThumbs thumbs(path, eaDir);
  for (const EAThumbInfo& row : rgEAThumbInfo) {
    if (IsThumbInSizeMap(row.name, sizeMap) != 0) {
      ++*(thumbs.IsPresent(row) ? presentOut : missingOut);
    }
  }
}
