// What is used of the video library, which is loaded when the first video is asked about and not
// with the program: with all that it needs it takes longer to load than a small directory takes to
// work through.
#pragma once

extern "C" {
#include <libavformat/avformat.h>
#include <libavutil/display.h>
}

namespace vela {

/// The functions of the video library that are used.
class VideoLibrary {
 public:
  /// Returns the library, loaded by the first call; null when it, or a function of it, is missing.
  /// It prints nothing.
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

  template <typename Function>
  void Find(void* library, const char* name, Function& function);

  bool isLoaded_ = false;
};

}  // namespace vela
