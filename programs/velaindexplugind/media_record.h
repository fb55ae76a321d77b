// The record of a photo or video.
#pragma once

#include <cstdint>
#include <string>

namespace vela {

/// The state of the file that a record was read from.
struct FileState {
  int64_t size = 0;         ///< bytes
  int64_t seconds = 0;      ///< modification time since the epoch
  int64_t nanoseconds = 0;  ///< of the modification time, 0 to 999,999,999
};

inline bool operator==(const FileState& a, const FileState& b) {
  return a.size == b.size && a.seconds == b.seconds && a.nanoseconds == b.nanoseconds;
}

/// What the headers of a media file contain.
struct MediaRecord {
  int32_t type = 0;      ///< 1 photo, 2 video
  uint32_t width = 0;    ///< pixels; of a photo as stored, of a video as displayed
  uint32_t height = 0;   ///< pixels, likewise
  int32_t rotation = 0;  ///< degrees clockwise that a player rotates a video by
  int32_t duration = 0;  ///< seconds
  uint32_t bitrate = 0;  ///< bits per second
  FileState file;
};

/// Reads the size and modification time of the regular file `path`, links followed. Returns 0 or an
/// errno value.
int ReadFileState(const std::string& path, FileState& state);

/// Reads the headers of `path`, as those of a photo or of a video depending on its name.
/// `record.file` is left as it is. Returns an error message, empty on success.
std::string ReadMediaHeaders(const std::string& path, MediaRecord& record);

}  // namespace vela
