// The pass over the photos of one directory.
#pragma once

#include <string>
#include <vector>

#include "profiles/directory_job.h"

/// Makes the missing thumbnails of the directory's photos, one photo after the other, unless
/// another instance is working there. Failures are logged and never stop the pass; only a volume
/// that is nearly full does.
void CreateDirectoryThumbs(const DirectoryJob& job);

/// Returns the names of the photo files in `dir`, sorted byte-wise; empty when it cannot be opened,
/// which is logged.
std::vector<std::string> ListDirectoryPhotos(const std::string& dir);
