#include <strings.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <initializer_list>

#include "platform/standalone/last_error.h"
#include "platform/standalone/video_container.h"
#include "platform/velaindex.h"

namespace {

using vela::Fail;
using vela::VideoContainer;

/// Whether `name` is one of the names of the format the file was read as.
bool IsReadAs(const VideoContainer& container, const char* name) {
  const char* names = container.Format().iformat->name;
  const size_t length = std::strlen(name);
  for (const char* at = names; at != nullptr; at = std::strchr(at, ',')) {
    if (*at == ',') ++at;
    if (std::strncmp(at, name, length) == 0 && (at[length] == ',' || at[length] == '\0')) {
      return true;
    }
  }
  return false;
}

/// QuickTime files are read as the same format: the newer ones name their brand, the older ones
/// none.
bool IsMp4(const VideoContainer& container) {
  constexpr const char* kQuickTimeBrand = "qt  ";
  if (!IsReadAs(container, "mp4")) return false;
  const AVDictionaryEntry* brand =
      container.Library().getEntry(container.Format().metadata, "major_brand", nullptr, 0);
  return brand != nullptr && std::strcmp(brand->value, kQuickTimeBrand) != 0;
}

/// The other Matroska files are read as the same format, and only the name tells a web server which
/// it is to announce.
bool IsWebm(const VideoContainer& container, const char* path) {
  return IsReadAs(container, "webm") && strcasecmp(VELAIndexExtGet(path), "webm") == 0;
}

/// Whether the sound is in one of the codecs, or there is none.
bool HasNoSoundBut(const VideoContainer& container, std::initializer_list<AVCodecID> codecs) {
  const AVStream* sound = container.Sound();
  if (sound == nullptr) return true;
  return std::find(codecs.begin(), codecs.end(), sound->codecpar->codec_id) != codecs.end();
}

/// Whether browsers play the video as it is.
bool IsForBrowsers(const VideoContainer& container, const char* path) {
  switch (container.Picture()->codecpar->codec_id) {
    case AV_CODEC_ID_H264:
      return IsMp4(container) && HasNoSoundBut(container, {AV_CODEC_ID_AAC});
    case AV_CODEC_ID_VP8:
    case AV_CODEC_ID_VP9:
    case AV_CODEC_ID_AV1:
      return IsWebm(container, path) &&
             HasNoSoundBut(container, {AV_CODEC_ID_VORBIS, AV_CODEC_ID_OPUS});
    default:
      return false;
  }
}

}  // namespace

int VELAIDX_IsVideoNeedConvert(const char* path) {
  if (path == nullptr) return Fail(EINVAL);
  VideoContainer container;
  const int error = container.OpenWithPicture(path);
  if (error != 0) return Fail(error);
  return IsForBrowsers(container, path) ? 0 : 1;
}
