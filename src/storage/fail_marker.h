// The failure marker: an empty file in place of a thumbnail that could not be made.
#pragma once

#include <ctime>
#include <optional>
#include <string>

#include "storage/thumb_size_class.h"

namespace vela {

/// Returns the path of the failure marker of the thumbnail `thumbPath`: its extension replaced.
/// Empty for a path without an extension.
std::string FailMarkerPath(const std::string& thumbPath);

/// Returns when the failure marker of the size class `row` of the photo `path` was created (seconds
/// since the epoch), nothing when there is none under either name.
std::optional<time_t> FindFailMarker(const char* path, const EAThumbInfo& row);

}  // namespace vela
