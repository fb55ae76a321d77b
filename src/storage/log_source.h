// The source names in the log messages of this layer and those above it.
#pragma once

namespace vela {

/// The directory pass, the preparation of sources and the file helpers.
inline constexpr char kProgramLogSource[] = "velathumb";

/// Size classes, metadata names and converted videos.
inline constexpr char kMetadataLogSource[] = "velamk_util";

/// Thumbnail status and creation queues.
inline constexpr char kStatusLogSource[] = "velamk_thumb_status";

}  // namespace vela
