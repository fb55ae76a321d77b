// Runs a conversion job and commits its outputs. The main header of this folder.
#pragma once

#include <cstdint>
#include <string>

#include "convert/convert_command.h"
#include "convert/photo_convert_job.h"
#include "convert/photo_thumb_setting.h"

/// Sorts the job's settings, runs the converter once for all of them and commits its outputs.
/// Returns 0 when there was nothing to do or every output was committed, else -1.
int RunPhotoConvertJob(PhotoConvertJob& job);

/// Moves the outputs of a successful run to their final names, unless the photo's size and block
/// count both differ from `oldSize` (bytes) and `oldBlocks` (then the outputs are deleted). Returns
/// 0 when every output was committed, else -1; one failed output does not stop the others.
int CommitPhotoThumbs(const PhotoConvertJob& job, const std::string& srcPath, int64_t oldBlocks,
                      int64_t oldSize);

/// Returns true when `a` is wider than `b`: jobs are sorted by descending width.
bool SortPhotoThumbSetting(const PhotoThumbSetting& a, const PhotoThumbSetting& b);
