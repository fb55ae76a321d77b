#include "thumb/phase_status.h"

#include "convert/photo_convert_job.h"
#include "posix/folder.h"
#include "profiles/photo_thumb_plan.h"
#include "profiles/thumbnail_profile.h"

using namespace vela;

bool IsPhaseThumbOutdated(const DirectoryJob& job, int phase, const std::string& photoPath,
                          const std::string& metadataDir) {
  const int count = GetProfileCount(job.profiles, phase);
  struct stat photo = {};
  if (ReadStatus(photoPath, photo) != 0) {
    return false;
  }
  for (int i = 0; i < count; ++i) {
    std::string thumbPath;
    struct stat thumb = {};
    if (FindExistingThumb(*GetProfileAt(job.profiles, i, phase), metadataDir, thumbPath, thumb) &&
        photo.st_mtim.tv_sec > thumb.st_mtim.tv_sec) {
      return true;
    }
  }
  return false;
}

bool IsPhaseThumbComplete(const DirectoryJob& job, int phase, const std::string& metadataDir) {
  const int count = GetProfileCount(job.profiles, phase);
  for (int i = 0; i < count; ++i) {
    std::string thumbPath;
    struct stat thumb = {};
    if (!FindExistingThumb(*GetProfileAt(job.profiles, i, phase), metadataDir, thumbPath, thumb) ||
        thumb.st_size < kSmallestThumb) {
      return false;
    }
  }
  return true;
}

int MarkAllProfilesFailed(const DirectoryJob& job, const std::string& metadataDir) {
  return MarkPhaseFailed(job, kAllPhases, metadataDir);
}

int MarkPhaseFailed(const DirectoryJob& job, int phase, const std::string& metadataDir) {
  return CreatePhaseFailMarkers(job, phase, metadataDir);
}
