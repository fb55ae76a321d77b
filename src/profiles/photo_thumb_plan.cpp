#include "profiles/photo_thumb_plan.h"

#include "convert/velamk_photo_thumb.h"
#include "platform/velaindex.h"
#include "posix/files.h"
#include "posix/folder.h"
#include "storage/fail_marker.h"
#include "storage/file_helpers.h"

using namespace vela;

namespace {

constexpr unsigned kMarkerMode = 0777;

/// Returns true for a file whose content can be read without waiting for another program.
bool IsReadable(const struct stat& status) {
  return IsRegularFileMode(status.st_mode) || IsDirectoryMode(status.st_mode);
}

void RemoveWithMarker(const std::string& thumbPath) {
  RemoveEntry(thumbPath);
  RemoveEntry(FailMarkerPath(thumbPath));
}

/// Copies the image options of the profile.
void DescribeImage(const ThumbnailProfile& profile, PhotoThumbSetting& setting) {
  setting.width = profile.size();
  setting.height = profile.size();
  setting.quality = profile.quality();
  setting.unsharp = profile.unsharp();
  setting.fillArea = profile.fillArea();
}

}  // namespace

int CreatePhotoThumbs(const DirectoryJob& dirJob, int phaseIndex, const std::string& srcPath,
                      const std::string& eaDir, bool autoOrient, bool /*ignoredFlag*/, int rotate) {
  PhotoConvertJob job;
  if (IsFileExist(srcPath.c_str(), 0) == 0) {
    return -1;
  }
  checkCreateDir(eaDir);
  const int count = GetProfileCount(dirJob.profiles, phaseIndex);
  if (count == 0) {
    return 0;
  }
  PhotoThumbSetting setting;
  for (int i = 0; i < count; ++i) {
    const ThumbnailProfile& profile = *GetProfileAt(dirJob.profiles, i, phaseIndex);
    if (IsThumbUpToDate(profile, srcPath, eaDir) != 0) {
      continue;
    }
    setting.srcPath = srcPath;
    setting.destPath = eaDir + "/" + profile.thumbName();
    setting.outDir = eaDir;
    setting.stripProfiles = phaseIndex == 0;
    setting.autoOrient = autoOrient;
    setting.rotate = rotate;
    DescribeImage(profile, setting);
    AddPhotoThumbSetting(job, setting);
  }
  const int result = RunPhotoConvertJob(job);
  if (result == -1) {
    CreatePhaseFailMarkers(dirJob, phaseIndex, eaDir);
  }
  return result;
}

int CreateRotatedThumb(const DirectoryJob& /*dirJob*/, int rotate, const ThumbnailProfile& profile,
                       const std::string& srcPath, const std::string& fileName,
                       const std::string& outDir) {
  PhotoConvertJob job;
  if (IsFileExist(srcPath.c_str(), 0) == 0) {
    return -1;
  }
  PhotoThumbSetting setting;
  setting.srcPath = srcPath;
  setting.destPath = outDir + "/" + fileName;
  setting.outDir = outDir;
  setting.rotate = rotate;
  DescribeImage(profile, setting);
  AddPhotoThumbSetting(job, setting);
  return RunPhotoConvertJob(job);
}

void AddPhotoThumbSetting(PhotoConvertJob& job, PhotoThumbSetting& setting) {
  setting.tempPath = MakeTempOutputPath(setting.destPath);
  job.settings.push_back(setting);
}

int FindExistingThumb(const ThumbnailProfile& profile, const std::string& eaDir,
                      std::string& foundPath, struct stat& foundStat) {
  for (const std::string& name : {profile.thumbName(), profile.filename()}) {
    const std::string path = eaDir + "/" + name;
    if (ReadStatus(path, foundStat) == 0 && IsReadable(foundStat)) {
      foundPath = path;
      return 1;
    }
  }
  return 0;
}

int IsThumbUpToDate(const ThumbnailProfile& profile, const std::string& srcPath,
                    const std::string& eaDir) {
  std::string thumbPath;
  struct stat thumb = {};
  struct stat source = {};
  if (FindExistingThumb(profile, eaDir, thumbPath, thumb) == 0 ||
      ReadStatus(srcPath, source) != 0) {
    return 0;
  }
  return thumb.st_mtim.tv_sec >= source.st_mtim.tv_sec && thumb.st_size > 0 ? 1 : 0;
}

void RemoveThumbAndFailMarker(const ThumbnailProfile& profile, const std::string& eaDir) {
  RemoveWithMarker(eaDir + "/" + profile.filename());
  RemoveWithMarker(eaDir + "/" + profile.thumbName());
}

void CreateThumbFailMarker(const ThumbnailProfile& profile, const std::string& eaDir) {
  RemoveThumbAndFailMarker(profile, eaDir);
  const std::string marker = FailMarkerPath(eaDir + "/" + profile.thumbName());
  FolderEntry(marker).Create(kMarkerMode);
}

namespace vela {

int CreatePhaseFailMarkers(const DirectoryJob& dirJob, int phaseIndex, const std::string& eaDir) {
  const int count = GetProfileCount(dirJob.profiles, phaseIndex);
  // When the directory has been renamed, the photo has not failed: the tools did not find it.
  for (int i = 0; i < count && IsInPlace(dirJob.path); ++i) {
    CreateThumbFailMarker(*GetProfileAt(dirJob.profiles, i, phaseIndex), eaDir);
  }
  return count;
}

}  // namespace vela
