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

  /// Opens the regular file `path` and reads its headers. Must be called once, before the other
  /// functions. Returns 0 or an errno value, EINVAL for a file that is not a video container and
  /// ELIBACC without libavformat.
  int Open(const char* path);

  /// Reads the first packets for information that the headers lack. Returns whether that succeeded.
  bool Probe();

  /// Opens the file and, if its headers do not list a video stream, probes for one. Returns the
  /// same as Open, and EINVAL when there is no video stream.
  int OpenWithVideo(const char* path);

  /// Returns the first video stream that is not the cover art of an audio file; null when none is
  /// known.
  const AVStream* VideoStream() const;

  /// Returns the first audio stream; null when none is known.
  const AVStream* AudioStream() const;

  /// Returns what libavformat knows about the file.
  const AVFormatContext& Format() const { return *format_; }

  /// Returns the size of the file in bytes.
  int64_t FileSize() const { return fileSize_; }

  /// Returns the library that opened the file.
  const VideoLibrary& Library() const { return *library_; }

 private:
  const AVStream* FirstStream(AVMediaType type) const;

  const VideoLibrary* library_ = nullptr;
  AVFormatContext* format_ = nullptr;
  int64_t fileSize_ = 0;
};

}  // namespace vela
