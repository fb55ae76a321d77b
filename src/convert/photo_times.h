// The file status of photos, and files that take their times.
#pragma once

#include <string>

#include "platform/vlibc.h"

namespace vela {

/// Option of VLIBCFileStat with which photos are examined throughout.
inline constexpr int kPhotoStatusOptions = 9;

/// Sets the access and modification time of `path` to the photo's modification time, in whole
/// seconds. Failures are ignored.
void DateLikePhoto(const std::string& path, const VLIBCFileStatus& photo);

}  // namespace vela
