// Whether a media file is portrait.
#include "ipc/velamk_ipc.h"
#include "platform/velaindex.h"
#include "posix/log.h"
#include "storage/log_source.h"
#include "storage/velamk_util.h"

using namespace vela;

int IsMediaPortraitInDB(const char* path) {
  VELA_MEDIA_INFO media = {};
  if (GetMediaFromPluginDB(THUMB_TYPE_PHOTO, path, media) < 0) {
    LogError(kMetadataLogSource, 128, "fail to get media from plugin db: " + LogText(path));
    return 0;
  }
  return media.width < media.height ? 1 : 0;
}

int IsFilePortrait(const char* path) {
  if (BlVELAIndexIsPhotoOnWebFile(path)) {
    uint32_t width = 0;
    uint32_t height = 0;
    return VELAIndexImgResGet(path, &width, &height) == 0 && width < height ? 1 : 0;
  }
  VELA_RESOLUTION video = {};
  VELAIDX_GetMediaResolution(path, &video);
  return video.width < video.height ? 1 : 0;
}
