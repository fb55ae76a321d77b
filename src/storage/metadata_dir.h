// The metadata directory of a media file.
#pragma once

#include <string>

namespace vela {

/// Stores the metadata directory of the media file `path` in `out`. Returns false when it has none,
/// which is logged with the caller's `line`.
bool FindMetadataDir(const char* path, int line, std::string& out);

}  // namespace vela
