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

/// Returns whether `name` is one of the names of the format of the file.
bool HasFormat(const VideoContainer& container, const char* name) {
  const char* names = container.Format().iformat->name;
  const size_t length = std::strlen(name);
  for (const char* at = names; at != nullptr; at = std::strchr(at, ',')) {
    if (*at == ',') {
      ++at;
    }
    if (std::strncmp(at, name, length) == 0 && (at[length] == ',' || at[length] == '\0')) {
      return true;
    }
  }
  return false;
}

/// QuickTime files have the same format in libavformat. The newer ones contain a brand of their
/// own, the older ones none.
bool IsMp4(const VideoContainer& container) {
  constexpr const char* kQuickTimeBrand = "qt  ";
  if (!HasFormat(container, "mp4")) {
    return false;
  }
  const AVDictionaryEntry* brand =
      container.Library().getEntry(container.Format().metadata, "major_brand", nullptr, 0);
  return brand != nullptr && std::strcmp(brand->value, kQuickTimeBrand) != 0;
}

/// All Matroska files have the same format in libavformat, and web servers choose the media type by
/// the file name.
bool IsWebm(const VideoContainer& container, const char* path) {
  return HasFormat(container, "webm") && strcasecmp(VELAIndexExtGet(path), "webm") == 0;
}

/// Returns whether the audio stream uses one of the codecs, or there is none.
bool HasNoAudioExcept(const VideoContainer& container, std::initializer_list<AVCodecID> codecs) {
  const AVStream* audio = container.AudioStream();
  if (audio == nullptr) {
    return true;
  }
  return std::find(codecs.begin(), codecs.end(), audio->codecpar->codec_id) != codecs.end();
}

/// Returns whether browsers play the video without conversion.
bool IsPlayedByBrowsers(const VideoContainer& container, const char* path) {
  switch (container.VideoStream()->codecpar->codec_id) {
    case AV_CODEC_ID_H264:
      return IsMp4(container) && HasNoAudioExcept(container, {AV_CODEC_ID_AAC});
    case AV_CODEC_ID_VP8:
    case AV_CODEC_ID_VP9:
    case AV_CODEC_ID_AV1:
      return IsWebm(container, path) &&
             HasNoAudioExcept(container, {AV_CODEC_ID_VORBIS, AV_CODEC_ID_OPUS});
    default:
      return false;
  }
}

}  // namespace

int VELAIDX_IsVideoNeedConvert(const char* path) {
  if (path == nullptr) {
    return Fail(EINVAL);
  }
  VideoContainer container;
  const int error = container.OpenWithVideo(path);
  if (error != 0) {
    return Fail(error);
  }
  return IsPlayedByBrowsers(container, path) ? 0 : 1;
}
