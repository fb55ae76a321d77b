// Turns a JPEG without decoding it to pixels.
#pragma once

#include <string>

/// How an attempt to turn a file ended.
enum class FileTurn {
  kDone,
  kFailed,      ///< the file is as it was; one line on standard error
  kImpossible,  ///< only a decoded picture could be turned; the file is as it was
};

/// Turns the JPEG at `path` clockwise by `quarterTurns` (0 to 3) times 90 degrees, whatever its
/// EXIF orientation says, and keeps everything else in it. The turned file takes the place of the
/// old one in one step. Impossible for anything but a whole JPEG, for one that would lose pixels at
/// an edge because it ends within a block, for one that would take more than `memoryLimit` bytes to
/// turn, and where libturbojpeg is not installed.
FileTurn TurnJpegFile(const std::string& path, int quarterTurns, size_t memoryLimit);
