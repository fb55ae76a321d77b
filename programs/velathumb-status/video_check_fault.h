// Whether videos can be checked.
#pragma once

#include <string>

namespace vela {

/// Returns why no video can be checked now, empty when they can. Without the index service every
/// video counts as landscape, and the check would remove the thumbnails of all others.
std::string FindVideoCheckFault();

}  // namespace vela
