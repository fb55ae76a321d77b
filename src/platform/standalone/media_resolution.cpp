// The video library is loaded when the first video is asked about, not with the program: with all
// that it needs it takes longer to load than a small directory takes to work through.
#include <dlfcn.h>
#include <sys/stat.h>

extern "C" {
#include <libavformat/avformat.h>
}

#include <cerrno>
#include <string>

#include "platform/standalone/last_error.h"
#include "platform/velaindex.h"

namespace {

using velaplatform::Fail;

#define VELA_TEXT_OF(x) #x
#define VELA_LIBRARY_NAME(version) "libavformat.so." VELA_TEXT_OF(version)
constexpr const char* kLibraryName = VELA_LIBRARY_NAME(LIBAVFORMAT_VERSION_MAJOR);

/// What is used of the video library.
class VideoLibrary {
 public:
  VideoLibrary();

  bool IsLoaded() const { return isLoaded_; }

  decltype(&avformat_open_input) openInput = nullptr;
  decltype(&avformat_close_input) closeInput = nullptr;
  decltype(&avformat_find_stream_info) findStreamInfo = nullptr;
  decltype(&av_dict_set) setOption = nullptr;
  decltype(&av_dict_free) freeOptions = nullptr;
  decltype(&av_log_set_level) setLogLevel = nullptr;

 private:
  template <typename Function>
  void Find(void* library, const char* name, Function& function);

  bool isLoaded_ = false;
};

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
  Find(library, "av_dict_set", setOption);
  Find(library, "av_dict_free", freeOptions);
  Find(library, "av_log_set_level", setLogLevel);
  if (isLoaded_) setLogLevel(AV_LOG_QUIET);
}

const VideoLibrary& LoadedLibrary() {
  static const VideoLibrary library;
  return library;
}

/// An open container.
class Container {
 public:
  explicit Container(const VideoLibrary& library) : library_(library) {}
  Container(const Container&) = delete;
  Container& operator=(const Container&) = delete;
  ~Container() { library_.closeInput(&format_); }

  /// Returns whether the file is a container.
  bool Open(const char* path);

  /// Reads the size of the first picture stream from what is known of it so far.
  bool ReadSize(VELA_RESOLUTION& resolution) const;

  /// Looks into the first packets for what the headers do not say.
  bool Probe() { return library_.findStreamInfo(format_, nullptr) >= 0; }

 private:
  const VideoLibrary& library_;
  AVFormatContext* format_ = nullptr;
};

/// The containers that video files come in. What the library knows beside them are playlists, which
/// send it to other files and keep it waiting for more, and pictures and sounds.
constexpr const char* kContainerFormats =
    "mov,mp4,matroska,webm,avi,asf,flv,mpegts,mpeg,mpegvideo,m4v,ogg,rm,h264,hevc,dv,wtv,mxf,nut";

bool Container::Open(const char* path) {
  // A path is never taken for an address, nor can a file send the library to one.
  const std::string address = std::string("file:") + path;
  AVDictionary* options = nullptr;
  library_.setOption(&options, "protocol_whitelist", "file", 0);
  library_.setOption(&options, "format_whitelist", kContainerFormats, 0);
  const int result = library_.openInput(&format_, address.c_str(), nullptr, &options);
  library_.freeOptions(&options);
  return result >= 0;
}

bool IsPicture(const AVStream& stream) {
  const bool isCover = (stream.disposition & AV_DISPOSITION_ATTACHED_PIC) != 0;
  return stream.codecpar->codec_type == AVMEDIA_TYPE_VIDEO && !isCover;
}

bool Container::ReadSize(VELA_RESOLUTION& resolution) const {
  for (unsigned i = 0; i < format_->nb_streams; ++i) {
    const AVStream& stream = *format_->streams[i];
    if (!IsPicture(stream)) continue;
    if (stream.codecpar->width <= 0 || stream.codecpar->height <= 0) return false;
    resolution = {stream.codecpar->width, stream.codecpar->height};
    return true;
  }
  return false;
}

/// Returns 0 or an errno value.
int GetVideoSize(const char* path, VELA_RESOLUTION& resolution) {
  struct stat status;
  if (stat(path, &status) != 0) return errno;
  if (!S_ISREG(status.st_mode)) return EINVAL;
  const VideoLibrary& library = LoadedLibrary();
  if (!library.IsLoaded()) return ELIBACC;
  Container container(library);
  if (!container.Open(path)) return EINVAL;
  if (container.ReadSize(resolution)) return 0;
  return container.Probe() && container.ReadSize(resolution) ? 0 : EINVAL;
}

int GetPhotoSize(const char* path, VELA_RESOLUTION& resolution) {
  uint32_t width = 0;
  uint32_t height = 0;
  if (VELAIndexImgResGet(path, &width, &height) != 0) return -1;
  if (width > INT32_MAX || height > INT32_MAX) return Fail(EOVERFLOW);
  resolution = {static_cast<int32_t>(width), static_cast<int32_t>(height)};
  return 0;
}

}  // namespace

int VELAIDX_GetMediaResolution(const char* path, VELA_RESOLUTION* resolution) {
  if (path == nullptr || resolution == nullptr) return Fail(EINVAL);
  if (BlVELAIndexIsPhotoOnWebFile(path)) return GetPhotoSize(path, *resolution);
  const int error = GetVideoSize(path, *resolution);
  return error == 0 ? 0 : Fail(error);
}
