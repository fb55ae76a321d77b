#include "platform/standalone/video_library.h"

#define VELA_TEXT_OF(x) #x
#define VELA_LIBRARY_NAME(version) "libavformat.so." VELA_TEXT_OF(version)

namespace vela {

namespace {

constexpr const char* kLibraryName = VELA_LIBRARY_NAME(LIBAVFORMAT_VERSION_MAJOR);

}  // namespace

VideoLibrary::VideoLibrary() : LoadedLibrary(kLibraryName, Binding::kNow) {
  Find("avformat_open_input", openInput);
  Find("avformat_close_input", closeInput);
  Find("avformat_find_stream_info", findStreamInfo);
  Find("av_stream_get_side_data", getSideData);
  Find("av_display_rotation_get", getRotation);
  Find("av_dict_get", getEntry);
  Find("av_dict_set", setEntry);
  Find("av_dict_free", freeEntries);
  Find("av_log_set_level", setLogLevel);
  if (IsLoaded()) {
    setLogLevel(AV_LOG_QUIET);
  }
}

const VideoLibrary* VideoLibrary::Get() {
  static const VideoLibrary library;
  return library.IsLoaded() ? &library : nullptr;
}

}  // namespace vela
