// Names of size classes in reports.
#pragma once

#include <string>
#include <vector>

#include "status_report.h"

namespace vela {

/// Returns the short name of a size class, such as "XL".
const char* SizeClassName(const EAThumbInfo& row);

/// Returns the short names of the photo's size classes in the given state, smallest first.
std::vector<std::string> SizeClassesInState(const PhotoReport& photo, ThumbState state);

/// Returns the short names of the photo's size classes with a failure marker, smallest first.
std::vector<std::string> FailedSizeClasses(const PhotoReport& photo);

}  // namespace vela
