#include "progress_totals.h"

#include <algorithm>
#include <cstdint>
#include <limits>

#include "entry_plan.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/service_log.h"
#include "progress/progress_summary.h"
#include "progress/velamk_progress.h"
#include "storage/creation_queue.h"
#include "storage/directory_status.h"
#include "storage/directory_tree.h"
#include "storage/fail_marker.h"
#include "storage/velamk_thumb_status.h"

namespace vela {

struct ProgressTotals::Sums {
  int64_t photos = 0;  ///< with missing thumbnails
  int64_t thumbs = 0;  ///< missing thumbnails
  /// Of these, the ones that failed in an earlier queue of this run and so were counted as done.
  int64_t failedPhotos = 0;
  int64_t failedThumbs = 0;
  std::set<FileIdentity> directories;
};

namespace {

void SetCounter(int kind, const char* key, int64_t value) {
  constexpr int64_t kHighest = std::numeric_limits<int>::max();
  const std::string text = std::to_string(std::clamp<int64_t>(value, 0, kHighest));
  const char* file = ConvProgressFile(kind);
  if (VLIBCFileSetKeyValue(file, key, text.c_str(), 0) < 0) {
    WriteLog(LogLevel::kWarning, std::string("cannot write ") + key + " in " + file);
  }
}

/// Sets the total to what is done, less `recounted`, plus what is outstanding.
void SetTotal(int kind, const char* totalKey, const char* completedKey, int64_t outstanding,
              int64_t recounted = 0) {
  const int64_t completed = std::max<int64_t>(0, GetConvProgress(kind, completedKey) - recounted);
  if (recounted > 0) {
    SetCounter(kind, completedKey, completed);
  }
  SetCounter(kind, totalKey, completed + outstanding);
}

int64_t CountQueuedVideos() {
  return int64_t{CountVideoQueueWork(kVideoQueue.tempFile)} + CountVideoQueueWork(kVideoQueue.file);
}

int CountFailures(const std::string& path, const PhotoThumbStates& thumbs) {
  int failures = 0;
  for (const EAThumbInfo& row : rgEAThumbInfo) {
    const bool isLacking = thumbs.IsLacking(static_cast<size_t>(row.size));
    failures += isLacking && FindFailMarker(path.c_str(), row) ? 1 : 0;
  }
  return failures;
}

}  // namespace

void ProgressTotals::CountDirectory(const char* path, const StopCheck& shouldStop,
                                    Sums& sums) const {
  FileIdentity directory;
  if (IdentifyDirectory(path, directory) != 0 || !sums.directories.insert(directory).second) {
    return;
  }
  const bool wasCounted = counted_.count(directory) != 0;
  const auto count = [&](const std::string& photo, const PhotoThumbStates& thumbs) {
    const int missing = thumbs.Missing();
    if (missing == 0) {
      return;
    }
    ++sums.photos;
    sums.thumbs += missing;
    const int failures = wasCounted ? CountFailures(photo, thumbs) : 0;
    sums.failedPhotos += failures > 0 ? 1 : 0;
    sums.failedThumbs += failures;
  };
  ForEachPhotoStatus(path, count, shouldStop);
}

void ProgressTotals::CountEntry(const std::string& entry, const StopCheck& shouldStop,
                                Sums& sums) const {
  const EntryTarget target = TargetOf(entry);
  if (!target.isTree) {
    CountDirectory(target.directory.c_str(), shouldStop, sums);
    return;
  }
  const auto count = [&](const char* path, bool isReadable) {
    if (isReadable) {
      CountDirectory(path, shouldStop, sums);
    }
  };
  ForEachIndexedDirectory(target.directory.c_str(), count, shouldStop);
}

void ProgressTotals::Reset() {
  counted_.clear();
  SetCounter(THUMB_TYPE_PHOTO, "completed", 0);
  SetCounter(THUMB_TYPE_PHOTO, "completed_thumb", 0);
}

/// Returns false when it was stopped.
bool ProgressTotals::Count(const std::vector<std::string>& entries, const StopCheck& shouldStop,
                           Sums& sums) const {
  for (const std::string& entry : entries) {
    if (shouldStop()) {
      return false;
    }
    CountEntry(entry, shouldStop, sums);
  }
  return !shouldStop();
}

void ProgressTotals::Write(const Sums& sums) const {
  SetTotal(THUMB_TYPE_PHOTO, "total", "completed", sums.photos, sums.failedPhotos);
  SetTotal(THUMB_TYPE_PHOTO, "total_thumb", "completed_thumb", sums.thumbs, sums.failedThumbs);
  if (countVideos_) {
    SetTotal(THUMB_TYPE_VIDEO, "total", "completed", CountQueuedVideos());
  }
}

void ProgressTotals::Set(const std::vector<std::string>& entries, const StopCheck& shouldStop) {
  Sums sums;
  if (Count(entries, shouldStop, sums)) {
    counted_.insert(sums.directories.begin(), sums.directories.end());
    Write(sums);
  }
}

void ProgressTotals::Update(const std::vector<std::string>& entries, const StopCheck& shouldStop) {
  Sums sums;
  if (Count(entries, shouldStop, sums)) {
    counted_.insert(sums.directories.begin(), sums.directories.end());
    // None has failed since Set took these out of the completed ones.
    sums.failedPhotos = 0;
    sums.failedThumbs = 0;
    Write(sums);
  }
}

}  // namespace vela
