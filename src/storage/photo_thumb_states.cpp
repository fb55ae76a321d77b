#include "storage/photo_thumb_states.h"

#include <algorithm>
#include <optional>
#include <string>

#include "platform/velaindex.h"
#include "posix/folder.h"
#include "posix/log.h"
#include "posix/truncated_text.h"
#include "storage/log_source.h"
#include "storage/thumb_age.h"
#include "storage/velamk_thumb_status.h"

using namespace vela;

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
  LogError(kStatusLogSource, 96, "[Error] get thumb size map: " + LogText(path));
  return false;
}

/// Examines the thumbnails of one photo; the photo itself is examined only once.
class PhotoThumbs {
 public:
  PhotoThumbs(const char* path, const char* eaDir) : path_(path), eaDir_(eaDir) {}

  ThumbState StateOf(const EAThumbInfo& row) {
    EAFileStatus thumb = {};
    if (FindEAFile(eaDir_, row.name, row.oldName, &thumb) == nullptr) {
      return ThumbState::kMissing;
    }
    if (!photo_) {
      photo_ = ExamineMediaFile(path_);
    }
    // The thumbnails of a photo that cannot be examined are never made again.
    const bool isOutdated = photo_ && IsDerivedFileOutdated(*photo_, thumb.size, thumb.modified);
    return isOutdated ? ThumbState::kOutdated : ThumbState::kPresent;
  }

 private:
  const char* path_;
  const char* eaDir_;
  std::optional<FileStatus> photo_;
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
    LogError(kStatusLogSource, 89, "[Error] get eadir: " + LogText(path));
    return photo;
  }
  if (!ResolveSizeMap(path, sizeMap)) {
    return photo;
  }
  photo.lookup = PhotoLookup::kDone;
  const HeldFolder folder(eaDir);
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
  const PhotoThumbStates photo = ReadPhotoThumbStates(path, sizeMap);
  *missingOut = photo.Missing();
  *presentOut = photo.Present();
}
