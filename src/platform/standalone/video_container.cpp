#include "platform/standalone/video_container.h"

#include <sys/stat.h>

#include <cerrno>
#include <string>

namespace vela {

namespace {

/// The containers that video files come in. What the library knows beside them are playlists, which
/// send it to other files and keep it waiting for more, and pictures and sounds.
constexpr const char* kContainerFormats =
    "mov,mp4,matroska,webm,avi,asf,flv,mpegts,mpeg,mpegvideo,m4v,ogg,rm,h264,hevc,dv,wtv,mxf,nut";

}  // namespace

VideoContainer::~VideoContainer() {
  if (format_ != nullptr) library_->closeInput(&format_);
}

int VideoContainer::Open(const char* path) {
  struct stat status;
  if (stat(path, &status) != 0) return errno;
  if (!S_ISREG(status.st_mode)) return EINVAL;
  fileSize_ = status.st_size;
  library_ = VideoLibrary::Get();
  if (library_ == nullptr) return ELIBACC;
  // A path is never taken for an address, nor can a file send the library to one.
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

int VideoContainer::OpenWithPicture(const char* path) {
  const int error = Open(path);
  if (error != 0 || Picture() != nullptr) return error;
  return Probe() && Picture() != nullptr ? 0 : EINVAL;
}

const AVStream* VideoContainer::FirstStream(AVMediaType type) const {
  for (unsigned i = 0; i < format_->nb_streams; ++i) {
    const AVStream* stream = format_->streams[i];
    const bool isCover = (stream->disposition & AV_DISPOSITION_ATTACHED_PIC) != 0;
    if (stream->codecpar->codec_type == type && !isCover) return stream;
  }
  return nullptr;
}

const AVStream* VideoContainer::Picture() const {
  return FirstStream(AVMEDIA_TYPE_VIDEO);
}

const AVStream* VideoContainer::Sound() const {
  return FirstStream(AVMEDIA_TYPE_AUDIO);
}

}  // namespace vela
