#include "status_scan.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <set>
#include <system_error>

#include "platform/velaindex.h"
#include "posix/files.h"
#include "storage/creation_queue.h"
#include "storage/directory_status.h"
#include "storage/directory_tree.h"
#include "storage/fail_marker.h"
#include "storage/video_level.h"

namespace vela {

namespace {

/// Returns whether the path is relative or has "." or ".." among its components.
bool IsIndirect(const std::filesystem::path& path) {
  return path.is_relative() || std::any_of(path.begin(), path.end(), [](const auto& component) {
           return component == "." || component == "..";
         });
}

/// Returns the path as it is in the queues: absolute, without dots and extra slashes.
std::string AbsolutePath(const std::string& given) {
  const std::filesystem::path path(given);
  std::error_code error;
  const auto plain =
      IsIndirect(path) ? std::filesystem::canonical(path, error) : path.lexically_normal();
  if (error) {
    return given;
  }
  // A trailing slash makes an empty last component.
  const bool endsInSlash = plain.has_relative_path() && !plain.has_filename();
  return (endsInSlash ? plain.parent_path() : plain).string();
}

PhotoReport ReportPhoto(const std::string& path, const PhotoThumbStates& thumbs) {
  PhotoReport photo;
  photo.path = path;
  photo.thumbs = thumbs;
  if (thumbs.Missing() > 0) {
    for (const EAThumbInfo& row : rgEAThumbInfo) {
      const auto size = static_cast<size_t>(row.size);
      if (photo.thumbs.IsLacking(size)) {
        photo.failures[size] = FindFailMarker(path.c_str(), row);
      }
    }
  }
  return photo;
}

class StatusScan {
 public:
  StatusScan(const ScanOptions& options, StatusSink& sink, const ScanErrorHandler& onError)
      : options_(options), sink_(sink), onError_(onError) {
    if (options.checkVideos) {
      totals_.all.videos = 0;
      totals_.queued.videos = 0;
    }
  }

  void ScanRoot(const std::string& directory);
  void End() { sink_.TakeTotals(totals_); }

 private:
  void ScanTree(const std::string& root);
  void ScanDirectory(const std::string& path);
  void ScanFound(const std::string& path);
  bool ScanPhotos(DirectoryReport& directory);

  const ScanOptions options_;
  StatusSink& sink_;
  const ScanErrorHandler& onError_;
  StatusTotals totals_;
  std::set<FileIdentity> visited_;
};

bool StatusScan::ScanPhotos(DirectoryReport& directory) {
  std::vector<PhotoReport> photos;
  const bool isRead = ForEachPhotoStatus(
      directory.path.c_str(), [&](const std::string& path, const PhotoThumbStates& thumbs) {
        if (thumbs.lookup != PhotoLookup::kAbsent) {
          photos.push_back(ReportPhoto(path, thumbs));
        }
      });
  std::sort(photos.begin(), photos.end(),
            [](const PhotoReport& a, const PhotoReport& b) { return a.path < b.path; });
  for (const PhotoReport& photo : photos) {
    if (photo.thumbs.lookup == PhotoLookup::kFailed) {
      onError_(photo.path, "its thumbnails cannot be looked up");
    }
    directory.counts.Add(photo);
    sink_.TakePhoto(photo);
  }
  return isRead;
}

void StatusScan::ScanDirectory(const std::string& path) {
  FileIdentity identity;
  const int error = IdentifyDirectory(path, identity);
  if (error != 0) {
    onError_(path, std::strerror(error));
    return;
  }
  if (!visited_.insert(identity).second) {
    return;
  }
  DirectoryReport directory;
  directory.path = path;
  directory.isQueued = IsQueued(kPhotoQueue, path.c_str());
  sink_.BeginDirectory();
  const bool isRead = ScanPhotos(directory);
  if (options_.checkVideos) {
    int videos = 0;
    const auto skip = [](const std::string&) {};
    if (isRead) {
      ReadVideoLevel(path.c_str(), skip, videos);
    }
    directory.counts.videos = videos;
  }
  totals_.Add(directory);
  sink_.EndDirectory(directory);
  if (!isRead) {
    onError_(path, "cannot be opened");
    return;
  }
  // Without this access the names can be read, but not the status of the files.
  const int accessError = CheckAccess(path, FileAccess::kExecute);
  if (accessError != 0) {
    onError_(path, std::strerror(accessError));
  }
}

/// Scans a directory of a tree, which may have been removed since it was found.
void StatusScan::ScanFound(const std::string& path) {
  FileIdentity identity;
  if (IdentifyDirectory(path, identity) != ENOENT) {
    ScanDirectory(path);
  }
}

void StatusScan::ScanTree(const std::string& root) {
  if (IsDirExist(root.c_str()) == 0) {
    ScanDirectory(root);
    return;
  }
  std::vector<std::string> directories;
  const int result = ForEachIndexedDirectory(
      root.c_str(), [&](const char* path, bool /*isReadable*/) { directories.emplace_back(path); });
  const int error = errno;
  std::sort(directories.begin(), directories.end());
  for (const std::string& directory : directories) {
    if (directory == root) {
      ScanDirectory(directory);
    } else {
      ScanFound(directory);
    }
  }
  if (result != 0) {
    onError_(root, std::string("was not scanned completely: ") + std::strerror(error));
  } else if (directories.empty()) {
    onError_(root, "is skipped in trees because of its name");
  }
}

void StatusScan::ScanRoot(const std::string& directory) {
  const std::string path = AbsolutePath(directory);
  if (options_.recursive) {
    ScanTree(path);
  } else {
    ScanDirectory(path);
  }
}

}  // namespace

void ScanStatus(const std::vector<std::string>& directories, const ScanOptions& options,
                StatusSink& sink, const ScanErrorHandler& onError) {
  StatusScan scan(options, sink, onError);
  for (const std::string& directory : directories) {
    scan.ScanRoot(directory);
  }
  scan.End();
}

}  // namespace vela
