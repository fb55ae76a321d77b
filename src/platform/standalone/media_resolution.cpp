#include <cerrno>
#include <cstdint>

#include "platform/standalone/last_error.h"
#include "platform/standalone/video_container.h"
#include "platform/velaindex.h"

namespace {

using vela::Fail;
using vela::VideoContainer;

bool ReadSize(const VideoContainer& container, VELA_RESOLUTION& resolution) {
  const AVStream* video = container.VideoStream();
  if (video == nullptr || video->codecpar->width <= 0 || video->codecpar->height <= 0) {
    return false;
  }
  resolution = {video->codecpar->width, video->codecpar->height};
  return true;
}

/// Returns 0 or an errno value.
int GetVideoSize(const char* path, VELA_RESOLUTION& resolution) {
  VideoContainer container;
  const int error = container.Open(path);
  if (error != 0) {
    return error;
  }
  if (ReadSize(container, resolution)) {
    return 0;
  }
  return container.Probe() && ReadSize(container, resolution) ? 0 : EINVAL;
}

int GetPhotoSize(const char* path, VELA_RESOLUTION& resolution) {
  uint32_t width = 0;
  uint32_t height = 0;
  if (VELAIndexImgResGet(path, &width, &height) != 0) {
    return -1;
  }
  if (width > INT32_MAX || height > INT32_MAX) {
    return Fail(EOVERFLOW);
  }
  resolution = {static_cast<int32_t>(width), static_cast<int32_t>(height)};
  return 0;
}

}  // namespace

int VELAIDX_GetMediaResolution(const char* path, VELA_RESOLUTION* resolution) {
  if (path == nullptr || resolution == nullptr) {
    return Fail(EINVAL);
  }
  if (BlVELAIndexIsPhotoOnWebFile(path)) {
    return GetPhotoSize(path, *resolution);
  }
  const int error = GetVideoSize(path, *resolution);
  return error == 0 ? 0 : Fail(error);
}
