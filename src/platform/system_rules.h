// System-wide constants that several programs share.
#pragma once

#include <cstdint>

namespace vela {

/// Name of the metadata directory next to the photos.
inline constexpr char kMetadataDirName[] = "@eaDir";

/// The system's settings, one `key="value"` per line.
inline constexpr char kSettingsFile[] = "/etc/velainfo.conf";

/// Bytes that must be available on a volume before a photo on it is converted.
inline constexpr uint64_t kLeastFreeSpace = uint64_t{1} << 30;

/// Marks an argument or a queue entry as a directory tree.
inline constexpr char kTreePrefix[] = "R:";

/// As an output of the converter, the null device: the run only finds out whether the photo can be
/// converted. With the prefix, ImageMagick writes a JPEG to it as well.
inline constexpr char kDiscardedOutput[] = "jpg:/dev/null";

/// The tools that are not confined: a file that only root can change, with the absolute path of a
/// program on each line. It exists only if an administrator has made it.
inline constexpr char kUnconfinedToolsFile[] = "/usr/vela/etc/unconfined-tools";

/// Bytes of that file at most; a longer one is ignored.
inline constexpr uint64_t kUnconfinedToolsSize = 65536;

/// Bytes of memory that a tool without a limit of its own may use, and of a file that it may write.
inline constexpr uint64_t kToolMemory = uint64_t{2} << 30;
/// The same for dcraw, which needs about ten bytes for each pixel of the largest photo.
inline constexpr uint64_t kRawDecoderMemory = uint64_t{6} << 30;
inline constexpr uint64_t kToolFileSize = uint64_t{4} << 30;

/// Number of size classes of thumbnails.
inline constexpr int kThumbSizeCount = 6;

/// The size map with all size classes.
inline constexpr int32_t kAllThumbSizes = (1 << kThumbSizeCount) - 1;

}  // namespace vela
