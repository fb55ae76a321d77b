#include "platform/standalone/video_library.h"

#include <dlfcn.h>

#define VELA_TEXT_OF(x) #x
#define VELA_LIBRARY_NAME(version) "libavformat.so." VELA_TEXT_OF(version)

namespace vela {

namespace {

constexpr const char* kLibraryName = VELA_LIBRARY_NAME(LIBAVFORMAT_VERSION_MAJOR);

}  // namespace

template <typename Function>
void VideoLibrary::Find(void* library, const char* name, Function& function) {
  function = reinterpret_cast<Function>(dlsym(library, name));
  isLoaded_ = isLoaded_ && function != nullptr;
}

VideoLibrary::VideoLibrary() {
  void* library = dlopen(kLibraryName, RTLD_NOW | RTLD_LOCAL);
  if (library == nullptr) return;
  isLoaded_ = true;
  Find(library, "avformat_open_input", openInput);
  Find(library, "avformat_close_input", closeInput);
  Find(library, "avformat_find_stream_info", findStreamInfo);
  Find(library, "av_stream_get_side_data", getSideData);
  Find(library, "av_display_rotation_get", getRotation);
  Find(library, "av_dict_get", getEntry);
  Find(library, "av_dict_set", setEntry);
  Find(library, "av_dict_free", freeEntries);
  Find(library, "av_log_set_level", setLogLevel);
  if (isLoaded_) setLogLevel(AV_LOG_QUIET);
}

const VideoLibrary* VideoLibrary::Get() {
  static const VideoLibrary library;
  return library.isLoaded_ ? &library : nullptr;
}

}  // namespace vela
