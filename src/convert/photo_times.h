// The file status of photos, and copying their times.
#pragma once

#include <string>

#include "platform/vlibc.h"

namespace vela {

/// The option that is passed to VLIBCFileStat for all photos.
inline constexpr int kPhotoStatusOptions = 9;

/// Sets the access and modification time of `path` to the photo's modification time, in whole
/// seconds. Failures are ignored.
void CopyPhotoTime(const std::string& path, const VLIBCFileStatus& photo);

}  // namespace vela
