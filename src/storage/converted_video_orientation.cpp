// Whether the converted videos have the orientation of their source.

#include <algorithm>
#include <iterator>

#include "platform/velaindex.h"
#include "posix/log.h"
#include "posix/truncated_text.h"
#include "storage/converted_video_names.h"
#include "storage/log_source.h"
#include "storage/velamk_util.h"

using namespace vela;

int IsVideoRotated(const char* path) {
  _VIDEO_METADATA_ metadata = {};
  if (VELAIDX_GetVideoMetadata(path, &metadata) < 0) {
    LogError(kMetadataLogSource, 213,
             "Failed to get media metadata from file [" + LogText(path) + "].");
    return 0;
  }
  const int32_t rotation = metadata.rotation;
  return rotation == 90 || rotation == 180 || rotation == 270 ? 1 : 0;
}

int HasConvertedFilm(const char* path) {
  return std::any_of(std::begin(kOrientedVideos), std::end(kOrientedVideos),
                     [path](const ConvertedVideoName& video) {
                       return IsEAFileExist2(path, video.name, video.oldName) > 0;
                     })
             ? 1
             : 0;
}

int IsEAFileOrientationMatched(const char* path, const char* name, const char* oldName) {
  if (path == nullptr) {
    LogError(kMetadataLogSource, 166, "Bad parameters.");
    return -1;
  }
  char video[kPathBufferSize] = "";
  if (GetEAFilePath(path, name, oldName, video, sizeof video) != 0) {
    return -1;
  }
  return IsMediaPortraitInDB(path) == IsFilePortrait(video) ? 1 : 0;
}

int HasMatchedConvertedFilm(const char* path) {
  return std::any_of(std::begin(kOrientedVideos), std::end(kOrientedVideos),
                     [path](const ConvertedVideoName& video) {
                       return IsEAFileOrientationMatched(path, video.name, video.oldName) == 1;
                     })
             ? 1
             : 0;
}
