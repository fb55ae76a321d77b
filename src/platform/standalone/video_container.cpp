#include "platform/standalone/video_container.h"

#include <cerrno>
#include <optional>
#include <string>

#include "posix/files.h"

namespace vela {

namespace {

/// The formats of video files. libavformat also reads playlists, which can make it open other files
/// and wait for more data, and image and audio files.
constexpr const char* kContainerFormats =
    "mov,mp4,matroska,webm,avi,asf,flv,mpegts,mpeg,mpegvideo,m4v,ogg,rm,h264,hevc,dv,wtv,mxf,nut";

}  // namespace

VideoContainer::~VideoContainer() {
  if (format_ != nullptr) {
    library_->closeInput(&format_);
  }
}

int VideoContainer::Open(const char* path) {
  const std::optional<FileStatus> status = ExamineFile(path);
  if (!status) {
    return errno;
  }
  if (!status->isRegular) {
    return EINVAL;
  }
  fileSize_ = status->size;
  library_ = VideoLibrary::Get();
  if (library_ == nullptr) {
    return ELIBACC;
  }
  // The path is never taken for a URL, and a file cannot make libavformat open one.
  const std::string address = std::string("file:") + path;
  AVDictionary* options = nullptr;
  library_->setEntry(&options, "protocol_whitelist", "file", 0);
  library_->setEntry(&options, "format_whitelist", kContainerFormats, 0);
  const int result = library_->openInput(&format_, address.c_str(), nullptr, &options);
  library_->freeEntries(&options);
  return result >= 0 ? 0 : EINVAL;
}

bool VideoContainer::Probe() {
  return library_->findStreamInfo(format_, nullptr) >= 0;
}

int VideoContainer::OpenWithVideo(const char* path) {
  const int error = Open(path);
  if (error != 0 || VideoStream() != nullptr) {
    return error;
  }
  return Probe() && VideoStream() != nullptr ? 0 : EINVAL;
}

const AVStream* VideoContainer::FirstStream(AVMediaType type) const {
  for (unsigned i = 0; i < format_->nb_streams; ++i) {
    const AVStream* stream = format_->streams[i];
    const bool isCover = (stream->disposition & AV_DISPOSITION_ATTACHED_PIC) != 0;
    if (stream->codecpar->codec_type == type && !isCover) {
      return stream;
    }
  }
  return nullptr;
}

const AVStream* VideoContainer::VideoStream() const {
  return FirstStream(AVMEDIA_TYPE_VIDEO);
}

const AVStream* VideoContainer::AudioStream() const {
  return FirstStream(AVMEDIA_TYPE_AUDIO);
}

}  // namespace vela
