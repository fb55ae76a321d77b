// Turns a JPEG without decoding it to pixels.
#pragma once

#include <cstddef>
#include <string>

namespace vela {

/// How an attempt to turn a file ended.
enum class FileTurn {
  kDone,
  kFailed,      ///< the file is as it was; TellFailure was called
  kImpossible,  ///< only a decoded picture could be turned; the file is as it was
};

/// Turns the JPEG at `path` clockwise by `quarterTurns` (1 to 3) times 90 degrees, whatever its
/// EXIF orientation says, and keeps everything else in it. The turned file takes the place of the
/// old one in one step. Impossible for anything but a whole JPEG, for one that would lose pixels at
/// an edge because it ends within a block, for one that would take more than `memoryLimit` bytes to
/// turn, where libturbojpeg is not installed, and for a file that a new one cannot stand for: a
/// symbolic link, one with several names or extended attributes, one whose owner, group or
/// permissions the new one would not have. Called while there is one thread.
FileTurn TurnJpegFile(const std::string& path, int quarterTurns, size_t memoryLimit);

}  // namespace vela
