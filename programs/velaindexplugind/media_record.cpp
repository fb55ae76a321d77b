#include "media_record.h"

#include <algorithm>
#include <cerrno>
#include <utility>

#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/files.h"

namespace vela {

namespace {

std::string ReadVideo(const std::string& path, MediaRecord& record) {
  VELA_RESOLUTION coded = {};
  _VIDEO_METADATA_ metadata = {};
  if (VELAIDX_GetMediaResolution(path.c_str(), &coded) != 0 ||
      VELAIDX_GetVideoMetadata(path.c_str(), &metadata) != 0) {
    return "the file cannot be read as a video";
  }
  record.type = THUMB_TYPE_VIDEO;
  record.width = static_cast<uint32_t>(coded.width);
  record.height = static_cast<uint32_t>(coded.height);
  record.rotation = metadata.rotation;
  record.duration = metadata.duration;
  record.bitrate = static_cast<uint32_t>(std::max(metadata.bitrate, 0));
  // Clients compare this with converted videos, which were rotated upright by the conversion.
  if (record.rotation == 90 || record.rotation == 270) {
    std::swap(record.width, record.height);
  }
  return {};
}

std::string ReadPhoto(const std::string& path, MediaRecord& record) {
  VELA_RESOLUTION stored = {};
  if (VELAIDX_GetMediaResolution(path.c_str(), &stored) != 0) {
    return "the file cannot be read as a photo";
  }
  record.type = THUMB_TYPE_PHOTO;
  record.width = static_cast<uint32_t>(stored.width);
  record.height = static_cast<uint32_t>(stored.height);
  return {};
}

}  // namespace

int ReadFileState(const std::string& path, FileState& state) {
  VLIBCFileStatus status;
  if (VLIBCFileStat(path.c_str(), 0, &status) != 0) {
    return VLIBCErrGet();
  }
  if (!IsRegularFileMode(status.mode)) {
    return EINVAL;
  }
  state = {status.size, status.modification.seconds, status.modification.nanoseconds};
  return 0;
}

std::string ReadMediaHeaders(const std::string& path, MediaRecord& record) {
  if (BlVELAIndexIsVideoOnWebFile(path.c_str())) {
    return ReadVideo(path, record);
  }
  if (BlVELAIndexIsPhotoOnWebFile(path.c_str())) {
    return ReadPhoto(path, record);
  }
  return "the name is not that of a photo or video";
}

}  // namespace vela
