// The name under which the metadata operations log.
#pragma once

inline constexpr char kMetadataLogSource[] = "velamk_util";
