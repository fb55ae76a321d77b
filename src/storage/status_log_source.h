// The name under which the status scans log.
#pragma once

inline constexpr char kStatusLogSource[] = "velamk_thumb_status";
