#include "progress/progress_summary.h"

#include <algorithm>
#include <cstdint>
#include <cstdio>

#include "platform/velaindex.h"
#include "progress/velamk_progress.h"

namespace vela {

namespace {

ProgressCount ReadCount(int kind, const char* totalKey, const char* completedKey) {
  const int total = GetConvProgress(kind, totalKey);
  return {total, GetConvProgress(kind, completedKey)};
}

std::string FormatCount(const char* kind, const ProgressCount& count) {
  char line[128] = "";
  std::snprintf(line, sizeof line, "total_%s: %d, complete_%s: %d, progress: %.2f", kind,
                count.total, kind, count.completed, double{count.Ratio()});
  return line;
}

}  // namespace

int ProgressCount::PartOf(int whole) const {
  const int64_t done = std::clamp(completed, 0, total);
  return static_cast<int>(done * whole / total);
}

FollowedCount ChooseCount(const ProgressSummary& summary) {
  if (summary.thumb.total > 0 || summary.photo.total <= 0) {
    return {"thumbnails", summary.thumb};
  }
  return {"photos", summary.photo};
}

const char* ConvProgressFile(int kind) {
  switch (kind) {
    case THUMB_TYPE_PHOTO:
      return "/var/spool/conv_progress_photo";
    case THUMB_TYPE_VIDEO:
      return "/var/spool/conv_progress_video";
    default:
      return nullptr;
  }
}

ProgressSummary ReadProgressSummary() {
  const ProgressCount photo = ReadCount(THUMB_TYPE_PHOTO, "total", "completed");
  const ProgressCount thumb = ReadCount(THUMB_TYPE_PHOTO, "total_thumb", "completed_thumb");
  return {photo, thumb, ReadCount(THUMB_TYPE_VIDEO, "total", "completed")};
}

std::vector<std::string> FormatProgressSummary(const ProgressSummary& summary) {
  return {"========== Convert Progress ==========", FormatCount("photo", summary.photo),
          FormatCount("thumb", summary.thumb), FormatCount("video", summary.video)};
}

}  // namespace vela
