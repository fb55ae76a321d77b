// Whether a derived file still fits the state of its source.
#pragma once

#include <sys/stat.h>

#include <string>

namespace vela {

/// Returns the path of the derived file `name` in the metadata directory `eaDir`, cut to what a
/// path buffer holds.
std::string DerivedFilePath(const std::string& eaDir, const char* name);

/// Examines the media file `path`, symbolic links followed. Returns false on failure, which is
/// logged.
bool StatMediaFile(const char* path, struct stat& out);

/// Returns true when the derived file is empty or older (whole seconds) than `source`.
bool IsDerivedFileOutdated(const struct stat& source, const struct stat& derived);

/// Returns true when the derived file is missing, empty, or older (whole seconds) than `source`.
bool IsDerivedFileOutdated(const struct stat& source, const std::string& derivedPath);

}  // namespace vela
