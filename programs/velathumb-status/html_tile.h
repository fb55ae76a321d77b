// A photo in the grid of an HTML page.
#pragma once

#include <ctime>
#include <string>

#include "status_report.h"

namespace vela {

/// Returns the tile of the photo as a list item. `thumb` is the content of a JPEG file; empty: no
/// thumbnail.
std::string PhotoTile(const PhotoReport& photo, const std::string& thumb);

/// Returns a point in time, seconds since the epoch, as a time element in local time.
std::string TimeElement(time_t time);

}  // namespace vela
