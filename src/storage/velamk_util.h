// Size classes and metadata names: the derived files of a media file, and whether they are still
// valid.
#pragma once

#include <cstdint>

#include "storage/thumb_size_class.h"

/// Returns 1 when the derived file `name` of the media file `path` is missing, empty or older than
/// it (whole seconds), else 0; also 0 when the media file cannot be examined, which is logged.
int IsEAThumbOutdated(const char* path, const char* name);

/// Returns 1 when the index daemon's record of `path` is portrait, else 0; an unknown
/// record is logged.
int IsMediaPortraitInDB(const char* path);

/// Returns 1 when the photo or video `path` itself is portrait, else 0, also when its size cannot
/// be read.
int IsFilePortrait(const char* path);

/// Checks the thumbnails of the media file `path` that `sizeMap` asks for and removes, under both
/// names, each that is outdated or of the wrong orientation. Returns 1 when all exist and are
/// valid, else 0.
int CheckEAThumbs(const char* path, int32_t sizeMap);

/// Returns 1 when the video `path` is to be rotated by 90, 180 or 270 degrees for display, else 0,
/// also when its metadata cannot be read, which is logged.
int IsVideoRotated(const char* path);

/// Returns 1 when the video `path` has one of the converted videos that keep its orientation (high,
/// medium, low, mobile), of any size, else 0.
int HasConvertedFilm(const char* path);

/// Compares the derived file `name` (or `oldName`) of the media file `path` with the plugin
/// daemon's record of it. Returns 1 when both or neither are portrait, 0 when they differ, -1 when
/// there is no such file or `path` is null, which is logged.
int IsEAFileOrientationMatched(const char* path, const char* name, const char* oldName);

/// Returns 1 when one of the files that HasConvertedFilm looks for has the orientation of the video
/// `path`, else 0.
int HasMatchedConvertedFilm(const char* path);

/// Returns 1 when the video `path` has a version for browsers, else 0; -1, logged, for a null path
/// and a video without a metadata directory. Removes the Flash video of a rotated video, under both
/// names, when only its orientation is wrong.
int IsWebVideoConverted(const char* path);

/// Returns 1 when the video `path` has a version for mobile devices, 0 or -1 as
/// IsWebVideoConverted. Removes the MPEG-4 conversion of a rotated video when only its orientation
/// is wrong.
int IsMobileVideoConverted(const char* path);

/// Checks whether the video `path` has the converted videos it needs, for mobile devices too when
/// the system settings ask for them. Returns 1 (also when a check ends in an error), 0, or -1 for a
/// null path, which is logged. Removes files as the two checks do.
int IsVideoConverted(const char* path);
