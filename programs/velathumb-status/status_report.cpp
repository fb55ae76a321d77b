#include "status_report.h"

#include <algorithm>

namespace vela {

std::string PhotoReport::Name() const {
  return path.substr(path.rfind('/') + 1);
}

int PhotoReport::FailureCount() const {
  return static_cast<int>(std::count_if(failures.begin(), failures.end(),
                                        [](const auto& failure) { return failure.has_value(); }));
}

std::optional<time_t> PhotoReport::FirstFailure() const {
  std::optional<time_t> first;
  for (const auto& failure : failures) {
    if (failure && (!first || *failure < *first)) {
      first = failure;
    }
  }
  return first;
}

void StatusCounts::Add(const PhotoReport& photo) {
  const int missing = photo.thumbs.Missing();
  ++photos;
  incompletePhotos += missing > 0 ? 1 : 0;
  missingThumbs += missing;
  presentThumbs += photo.thumbs.Present();
  failureMarkers += photo.FailureCount();
}

void StatusCounts::Add(const StatusCounts& other) {
  photos += other.photos;
  incompletePhotos += other.incompletePhotos;
  presentThumbs += other.presentThumbs;
  missingThumbs += other.missingThumbs;
  failureMarkers += other.failureMarkers;
  if (other.videos) {
    videos = videos.value_or(0) + *other.videos;
  }
}

void StatusTotals::Add(const DirectoryReport& directory) {
  ++directories;
  all.Add(directory.counts);
  if (directory.isQueued) {
    ++queuedDirectories;
    queued.Add(directory.counts);
  }
}

}  // namespace vela
