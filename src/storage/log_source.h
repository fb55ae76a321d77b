// The name under which the metadata operations log.
#pragma once

namespace vela {

inline constexpr char kMetadataLogSource[] = "velamk_util";

}  // namespace vela
