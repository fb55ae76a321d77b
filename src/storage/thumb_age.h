// Whether a derived file is up to date with its source.
#pragma once

#include <optional>
#include <string>

#include "posix/files.h"

namespace vela {

/// Examines the media file `path`, symbolic links followed. Returns nothing on failure, which is
/// logged.
std::optional<FileStatus> ExamineMediaFile(const char* path);

/// Returns true when a derived file of `size` bytes, modified at `modified` (seconds since the
/// epoch), is empty or older than `source`.
bool IsDerivedFileOutdated(const FileStatus& source, int64_t size, int64_t modified);

}  // namespace vela
