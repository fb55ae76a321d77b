// Media records from the files themselves.
#pragma once

#include <string>

#include "media_record.h"

namespace vela {

/// Reads the size and modification time of the regular file `path`, links followed. Returns 0 or an
/// errno value.
int ReadFileState(const std::string& path, FileState& state);

/// Reads what the headers of `path` tell; which kind it is, is told by its name. `record.file`
/// stays as it is. Returns what went wrong, empty when nothing did.
std::string ReadMediaHeaders(const std::string& path, MediaRecord& record);

}  // namespace vela
