// Whether a video has the converted videos that it needs.

#include <initializer_list>
#include <string>

#include "configuration/settings.h"
#include "ipc/velamk_ipc.h"
#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/log.h"
#include "storage/converted_video_names.h"
#include "storage/log_source.h"
#include "storage/metadata_dir.h"
#include "storage/velamk_util.h"

using namespace vela;

namespace {

constexpr int64_t kSmallestConvertedVideo = 2;
/// Conversions of a video with this many bits per second or more lose too much quality.
constexpr uint32_t kHighBitrate = 4500000;

bool IsConvertedVideoPresent(const std::string& eaDir, const ConvertedVideoName& video) {
  int64_t size = 0;
  return IsEAFileExist(eaDir.c_str(), &size, video.name, video.oldName) != nullptr &&
         size >= kSmallestConvertedVideo;
}

enum class VideoQuality { kGood, kPoor, kUnknown };

/// Judges the H.264 and iPhone versions of a video by the video's own record; a failed lookup is
/// logged with the caller's `line`.
VideoQuality JudgeConvertedVideo(const char* path, int line) {
  VELA_MEDIA_INFO media = {};
  if (GetMediaFromPluginDB(THUMB_TYPE_PHOTO, path, media) < 0) {
    LogError(kMetadataLogSource, line, "fail to get media from plugin db: " + LogText(path));
    return VideoQuality::kUnknown;
  }
  return media.bitrate < kHighBitrate ? VideoQuality::kGood : VideoQuality::kPoor;
}

/// Returns true when a conversion of a rotated video has its orientation; one that does not is
/// removed, so that it is made again.
bool KeepMatchingVideo(const char* path, const ConvertedVideoName& video) {
  if (IsEAFileExist2(path, video.name, video.oldName) <= 0) {
    return false;
  }
  if (IsEAFileOrientationMatched(path, video.name, video.oldName) == 1) {
    return true;
  }
  RemoveEAFile2(path, video.name, video.oldName);
  return false;
}

/// Judges a rotated video, for which `fallback` is accepted in addition to the conversions that
/// keep its orientation.
bool IsRotatedVideoConverted(const char* path, const ConvertedVideoName& fallback) {
  if (HasConvertedFilm(path) != 0 && HasMatchedConvertedFilm(path) != 0) {
    return true;
  }
  return KeepMatchingVideo(path, fallback);
}

bool IsUprightVideoOnWeb(const char* path, const std::string& eaDir) {
  for (const ConvertedVideoName& video :
       {kHighVideo, kMediumVideo, kLowVideo, kMobileVideo, kIphoneVideo, kFlashVideo}) {
    if (IsConvertedVideoPresent(eaDir, video)) {
      return true;
    }
  }
  return IsConvertedVideoPresent(eaDir, kH264Video) &&
         JudgeConvertedVideo(path, 243) == VideoQuality::kGood;
}

/// Returns true when the H.264 or the iPhone version of a video suits mobile devices.
bool HasGoodPhoneVideo(const char* path, const std::string& eaDir) {
  if (IsConvertedVideoPresent(eaDir, kH264Video)) {
    const VideoQuality quality = JudgeConvertedVideo(path, 344);
    // Without a record the iPhone version is not considered either.
    if (quality != VideoQuality::kPoor) {
      return quality == VideoQuality::kGood;
    }
  }
  return IsConvertedVideoPresent(eaDir, kIphoneVideo) &&
         JudgeConvertedVideo(path, 357) == VideoQuality::kGood;
}

bool IsUprightVideoOnMobile(const char* path, const std::string& eaDir) {
  return HasConvertedFilm(path) != 0 || HasGoodPhoneVideo(path, eaDir) ||
         IsConvertedVideoPresent(eaDir, kMpeg4Video) ||
         IsConvertedVideoPresent(eaDir, kConvertedMpeg4Video);
}

/// The lines with which a check logs a null path and a video without a metadata directory.
struct CheckLines {
  int badParameters;
  int noMetadataDir;
};

/// Returns false, logged, when `path` is null or has no metadata directory.
bool BeginCheck(const char* path, const CheckLines& lines, std::string& eaDir) {
  if (path == nullptr) {
    LogError(kMetadataLogSource, lines.badParameters, "Bad parameters.");
    return false;
  }
  return FindMetadataDir(path, lines.noMetadataDir, eaDir);
}

bool AreMobileVideosWanted() {
  return VLIBCFileCheckKeyValue(kSettingsFile, kMobileVideoKey, kYes, 0) != 0;
}

}  // namespace

int IsWebVideoConverted(const char* path) {
  std::string eaDir;
  if (!BeginCheck(path, {460, 465}, eaDir)) {
    return -1;
  }
  const bool isConverted = IsVideoRotated(path) != 0 ? IsRotatedVideoConverted(path, kFlashVideo)
                                                     : IsUprightVideoOnWeb(path, eaDir);
  return isConverted ? 1 : 0;
}

int IsMobileVideoConverted(const char* path) {
  std::string eaDir;
  if (!BeginCheck(path, {408, 413}, eaDir)) {
    return -1;
  }
  const bool isConverted = IsVideoRotated(path) != 0
                               ? IsRotatedVideoConverted(path, kConvertedMpeg4Video)
                               : IsUprightVideoOnMobile(path, eaDir);
  return isConverted ? 1 : 0;
}

int IsVideoConverted(const char* path) {
  if (path == nullptr) {
    LogError(kMetadataLogSource, 509, "Bad parameters.");
    return -1;
  }
  const bool mobileVideosWanted = AreMobileVideosWanted();
  if (IsWebVideoConverted(path) == 0) {
    return 0;
  }
  // A check that ends in an error counts as converted: there is nothing to do for that video.
  return !mobileVideosWanted || IsMobileVideoConverted(path) != 0 ? 1 : 0;
}
