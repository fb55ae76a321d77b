// The name under which the status scans log.
#pragma once

namespace vela {

inline constexpr char kStatusLogSource[] = "velamk_thumb_status";

}  // namespace vela
