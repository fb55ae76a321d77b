// What is known of a photo or video.
#pragma once

#include <cstdint>

namespace vela {

/// The state of a file that a record was read from.
struct FileState {
  int64_t size = 0;         ///< bytes
  int64_t seconds = 0;      ///< modification time since the epoch
  int64_t nanoseconds = 0;  ///< of the modification time, 0 to 999,999,999
};

inline bool operator==(const FileState& a, const FileState& b) {
  return a.size == b.size && a.seconds == b.seconds && a.nanoseconds == b.nanoseconds;
}

/// What the headers of a media file tell.
struct MediaRecord {
  int32_t type = 0;      ///< 1 photo, 2 video
  uint32_t width = 0;    ///< pixels; of a photo as stored, of a video as shown
  uint32_t height = 0;   ///< pixels, likewise
  int32_t rotation = 0;  ///< degrees clockwise that a player turns a video by
  int32_t duration = 0;  ///< seconds
  uint32_t bitrate = 0;  ///< bits per second
  FileState file;
};

}  // namespace vela
