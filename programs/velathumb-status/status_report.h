// Status of photos, of directories and of all directories together.
#pragma once

#include <array>
#include <cstdint>
#include <ctime>
#include <optional>
#include <string>

#include "storage/photo_thumb_states.h"

namespace vela {

/// One photo.
struct PhotoReport {
  std::string path;
  PhotoThumbStates thumbs;
  /// When a missing or outdated thumbnail could not be made (seconds since the epoch), by size
  /// class.
  std::array<std::optional<time_t>, kThumbSizeCount> failures = {};

  std::string reason;  ///< why they could not be made, unchecked text; empty when not examined

  /// Returns the file name.
  std::string Name() const;

  /// Returns when a thumbnail could not be made for the first time, nothing without a failure.
  std::optional<time_t> FirstFailure() const;

  /// Returns the number of failure markers.
  int FailureCount() const;
};

/// Counts of one directory or of several.
struct StatusCounts {
  int64_t photos = 0;
  int64_t incompletePhotos = 0;   ///< with a thumbnail missing or outdated
  int64_t presentThumbs = 0;      ///< up to date
  int64_t missingThumbs = 0;      ///< missing or outdated
  int64_t failureMarkers = 0;     ///< thumbnails that could not be made
  std::optional<int64_t> videos;  ///< videos that need work; nothing when not checked

  void Add(const PhotoReport& photo);
  void Add(const StatusCounts& other);
  bool HasWork() const { return incompletePhotos > 0 || videos.value_or(0) > 0; }
};

/// One directory without its subdirectories.
struct DirectoryReport {
  std::string path;
  bool isQueued = false;  ///< is in the photo queue
  StatusCounts counts;
};

/// All directories of a scan.
struct StatusTotals {
  int64_t directories = 0;
  int64_t queuedDirectories = 0;
  StatusCounts all;     ///< of all directories
  StatusCounts queued;  ///< of those in the photo queue

  void Add(const DirectoryReport& directory);
};

/// Receives the results of a scan in this order: for each directory its beginning, its photos and
/// its end; then the totals.
class StatusSink {
 public:
  StatusSink() = default;
  StatusSink(const StatusSink&) = delete;
  StatusSink& operator=(const StatusSink&) = delete;
  virtual ~StatusSink() = default;

  virtual void BeginDirectory() {}
  virtual void TakePhoto(const PhotoReport& /*photo*/) {}
  virtual void EndDirectory(const DirectoryReport& /*directory*/) {}
  virtual void TakeTotals(const StatusTotals& /*totals*/) {}
};

}  // namespace vela
