#include "progress_totals.h"

#include <algorithm>
#include <cstdint>
#include <limits>

#include "counted_directories.h"
#include "entry_plan.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "progress/progress_summary.h"
#include "progress/velamk_progress.h"
#include "run_log.h"
#include "storage/creation_queue.h"
#include "storage/velamk_thumb_status.h"

namespace {

struct Outstanding {
  int64_t photos = 0;
  int64_t thumbs = 0;
};

Outstanding CountEntries(const std::vector<std::string>& entries) {
  Outstanding sum;
  CountedDirectories counted(entries);
  for (const std::string& entry : entries) {
    const EntryTarget target = TargetOf(entry);
    if (!counted.Add(entry, target)) {
      continue;
    }
    int photos = 0;
    int thumbs = 0;
    if (target.isTree) {
      GetDirThumbStatusRecursive(target.directory.c_str(), &photos, &thumbs);
    } else {
      GetDirThumbStatus(target.directory.c_str(), &photos, &thumbs);
    }
    sum.photos += photos;
    sum.thumbs += thumbs;
  }
  return sum;
}

void SetCounter(int kind, const char* key, int64_t value) {
  constexpr int64_t kHighest = std::numeric_limits<int>::max();
  const std::string text = std::to_string(std::clamp<int64_t>(value, 0, kHighest));
  const char* file = ConvProgressFile(kind);
  if (VLIBCFileSetKeyValue(file, key, text.c_str(), 0) < 0) {
    WriteLog(LogLevel::kWarning, std::string("cannot write ") + key + " in " + file);
  }
}

void SetTotal(int kind, const char* totalKey, const char* completedKey, int64_t outstanding) {
  SetCounter(kind, totalKey, int64_t{GetConvProgress(kind, completedKey)} + outstanding);
}

int64_t CountWaitingVideos() {
  return int64_t{CountVideoQueueWork(kVideoQueue.tempFile)} + CountVideoQueueWork(kVideoQueue.file);
}

}  // namespace

void SetProgressTotals(const std::vector<std::string>& entries, const TotalsQuestion& question) {
  if (question.beginAnew) {
    SetCounter(THUMB_TYPE_PHOTO, "completed", 0);
    SetCounter(THUMB_TYPE_PHOTO, "completed_thumb", 0);
  }
  const Outstanding outstanding = CountEntries(entries);
  SetTotal(THUMB_TYPE_PHOTO, "total", "completed", outstanding.photos);
  SetTotal(THUMB_TYPE_PHOTO, "total_thumb", "completed_thumb", outstanding.thumbs);
  if (question.countVideos) {
    SetTotal(THUMB_TYPE_VIDEO, "total", "completed", CountWaitingVideos());
  }
}
