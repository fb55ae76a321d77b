// The functions of libavformat, which is loaded for the first video and not with the program:
// loading it with its dependencies takes longer than processing a small directory.
#pragma once

extern "C" {
#include <libavformat/avformat.h>
#include <libavutil/display.h>
}

#include "posix/loaded_library.h"

namespace vela {

/// The functions of libavformat that are used.
class VideoLibrary final : private LoadedLibrary {
 public:
  /// Returns the library, which the first call loads; null when it or one of its functions is
  /// missing. Its messages are turned off.
  static const VideoLibrary* Get();

  decltype(&::avformat_open_input) openInput = nullptr;
  decltype(&::avformat_close_input) closeInput = nullptr;
  decltype(&::avformat_find_stream_info) findStreamInfo = nullptr;
  decltype(&::av_stream_get_side_data) getSideData = nullptr;
  decltype(&::av_display_rotation_get) getRotation = nullptr;
  decltype(&::av_dict_get) getEntry = nullptr;
  decltype(&::av_dict_set) setEntry = nullptr;
  decltype(&::av_dict_free) freeEntries = nullptr;
  decltype(&::av_log_set_level) setLogLevel = nullptr;

 private:
  VideoLibrary();
};

}  // namespace vela
