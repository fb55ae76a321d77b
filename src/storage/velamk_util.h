// Size classes and metadata names: what exists beside a media file, and whether it is still good.
#pragma once

#include <cstdint>

#include "storage/thumb_size_class.h"

/// Returns 1 when the derived file `name` of the media file `path` is missing, empty or older than
/// it (whole seconds), else 0; also 0 when the media file cannot be examined, which is logged.
int IsEAThumbOutdated(const char* path, const char* name);

/// Returns 1 when the plugin daemon's record of `path` is higher than wide, else 0; an unknown
/// record is logged.
int IsMediaPortraitInDB(const char* path);

/// Returns 1 when the photo or film `path` itself is higher than wide, else 0, also when its size
/// cannot be read.
int IsFilePortrait(const char* path);

/// Checks the thumbnails of the media file `path` that `sizeMap` asks for and removes, under both
/// names, each that is outdated or of the wrong orientation. Returns 1 when all are there and good,
/// else 0.
int CheckEAThumbs(const char* path, int32_t sizeMap);
