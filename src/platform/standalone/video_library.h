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
  decltype(&::av_display_rotation_get) getRotation = nullptr;
  decltype(&::av_dict_get) getEntry = nullptr;
  decltype(&::av_dict_set) setEntry = nullptr;
  decltype(&::av_dict_free) freeEntries = nullptr;
  decltype(&::av_log_set_level) setLogLevel = nullptr;

  /// Returns what the container says about the stream, with its number of bytes; null when there is
  /// nothing of that type.
  const uint8_t* SideDataOf(const AVStream& stream, AVPacketSideDataType type, size_t& size) const;

 private:
  VideoLibrary();

  // Where libavformat keeps that data depends on its version.
#if LIBAVFORMAT_VERSION_MAJOR >= 61
  decltype(&::av_packet_side_data_get) getSideData_ = nullptr;
#else
  decltype(&::av_stream_get_side_data) getSideData_ = nullptr;
#endif
};

}  // namespace vela
