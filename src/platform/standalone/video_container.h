// An open video file.
#pragma once

#include <cstdint>

#include "platform/standalone/video_library.h"

namespace vela {

class VideoContainer {
 public:
  VideoContainer() = default;
  VideoContainer(const VideoContainer&) = delete;
  VideoContainer& operator=(const VideoContainer&) = delete;
  ~VideoContainer();

  /// Opens the regular file `path` and reads its headers; called once. Returns 0 or an errno value,
  /// EINVAL for what is no video container and ELIBACC without the video library. The other
  /// functions are for a container that this has opened.
  int Open(const char* path);

  /// Looks into the first packets for what the headers do not say. Returns whether that succeeded.
  bool Probe();

  /// Opens the file and, where its headers name no picture stream, probes it for one. Returns as
  /// Open, EINVAL also when there is none.
  int OpenWithPicture(const char* path);

  /// The first stream that is a film's picture, not the cover picture of a piece of music; null
  /// when none is known.
  const AVStream* Picture() const;

  /// The first sound stream; null when none is known.
  const AVStream* Sound() const;

  /// What the video library knows of the file.
  const AVFormatContext& Format() const { return *format_; }

  /// Size of the file in bytes.
  int64_t FileSize() const { return fileSize_; }

  /// The library that has opened the file.
  const VideoLibrary& Library() const { return *library_; }

 private:
  const AVStream* FirstStream(AVMediaType type) const;

  const VideoLibrary* library_ = nullptr;
  AVFormatContext* format_ = nullptr;
  int64_t fileSize_ = 0;
};

}  // namespace vela
