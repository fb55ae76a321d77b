// System-wide constants that several programs share.
#pragma once

#include <cstdint>

namespace vela {

/// Name of the metadata directory next to the photos.
inline constexpr char kMetadataDirName[] = "@eaDir";

/// The system's settings, one `key="value"` per line.
inline constexpr char kSettingsFile[] = "/etc/velainfo.conf";

/// Setting: the time until which conversion is paused, in seconds since the epoch.
inline constexpr char kResumeTimeKey[] = "thumb_conv_resume_time";

/// Setting: "yes" makes root work in a directory with the identity of its owner.
inline constexpr char kWorkAsOwnerKey[] = "work_as_owner";

/// Bytes that must be available on a volume before a photo on it is converted.
inline constexpr uint64_t kLeastFreeSpace = uint64_t{1} << 30;

/// Marks an argument or a queue entry as a directory tree.
inline constexpr char kTreePrefix[] = "R:";

/// Number of size classes of thumbnails.
inline constexpr int kThumbSizeCount = 6;

/// The size map with all size classes.
inline constexpr int32_t kAllThumbSizes = (1 << kThumbSizeCount) - 1;

}  // namespace vela
