#include "platform/standalone/video_library.h"

#include "platform/installed_names.h"

namespace vela {

VideoLibrary::VideoLibrary() : LoadedLibrary(kAvformatLibrary, Binding::kNow) {
  Find("avformat_open_input", openInput);
  Find("avformat_close_input", closeInput);
  Find("avformat_find_stream_info", findStreamInfo);
  Find("av_display_rotation_get", getRotation);
  Find("av_dict_get", getEntry);
  Find("av_dict_set", setEntry);
  Find("av_dict_free", freeEntries);
  Find("av_log_set_level", setLogLevel);
#if LIBAVFORMAT_VERSION_MAJOR >= 61
  Find("av_packet_side_data_get", getSideData_);
#else
  Find("av_stream_get_side_data", getSideData_);
#endif
  if (IsLoaded()) {
    setLogLevel(AV_LOG_QUIET);
  }
}

const uint8_t* VideoLibrary::SideDataOf(const AVStream& stream, AVPacketSideDataType type,
                                        size_t& size) const {
#if LIBAVFORMAT_VERSION_MAJOR >= 61
  const AVCodecParameters& parameters = *stream.codecpar;
  const AVPacketSideData* const data =
      getSideData_(parameters.coded_side_data, parameters.nb_coded_side_data, type);
  size = data == nullptr ? 0 : data->size;
  return data == nullptr ? nullptr : data->data;
#else
  size = 0;
  return getSideData_(&stream, type, &size);
#endif
}

const VideoLibrary* VideoLibrary::Get() {
  static const VideoLibrary library;
  return library.IsLoaded() ? &library : nullptr;
}

}  // namespace vela
