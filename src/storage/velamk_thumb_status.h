// Thumbnail status: what is still to be done.
#pragma once

#include <cstdint>

/// Counts the thumbnails of the photo `path` that `sizeMap` asks for (-1: ask the index library)
/// into `missingOut` (missing or outdated) and `presentOut`. Both are 0 when the photo does not
/// exist or cannot be looked up; the latter is logged.
void GetThumbStatus(const char* path, int* missingOut, int* presentOut, int32_t sizeMap);
