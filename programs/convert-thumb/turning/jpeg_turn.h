// Turns a JPEG without decoding it to pixels.
#pragma once

#include <cstddef>
#include <string>

namespace vela {

/// Result of turning a file.
enum class FileTurn {
  kDone,
  kFailed,      ///< the file is unchanged; ReportFailure has been called
  kImpossible,  ///< cannot be done without decoding the picture; the file is unchanged
};

/// Turns the JPEG at `path` clockwise by `quarterTurns` (1 to 3) times 90 degrees, whatever its
/// EXIF orientation, and keeps everything else in the file. The file is replaced atomically.
/// Impossible for anything but a complete JPEG, for one that would lose pixels because its edge is
/// not on a block boundary, for one that needs more than `memoryLimit` bytes, without libturbojpeg,
/// and for a file that cannot be replaced (see ReadReplaceableFile). Called while there is one
/// thread.
FileTurn TurnJpegFile(const std::string& path, int quarterTurns, size_t memoryLimit);

}  // namespace vela
