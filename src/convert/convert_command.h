// The converter's command line: temporary output names and the arguments of each output.
#pragma once

#include <string>

#include "convert/photo_convert_job.h"

namespace VELAUtils {
class ProcessRunner;
}

/// Returns a unique name in the directory of `destPath`, with its extension, under which the
/// converter writes the thumbnail; the file does not exist on return. Returns the bare template
/// when no name can be created.
std::string MakeTempOutputPath(const std::string& destPath);

/// Appends the option that keeps the converter's scratch files in the output directory; nothing for
/// a job without settings or without an output directory.
void AddTempPathDefine(const PhotoConvertJob& job, VELAUtils::ProcessRunner& runner);

/// Appends the image options of one thumbnail.
void AddThumbOptions(VELAUtils::ProcessRunner& runner, const PhotoThumbSetting& setting);

/// Appends the block that makes the largest thumbnail from the photo and keeps only it in memory.
void AddFirstOutput(VELAUtils::ProcessRunner& runner, const PhotoThumbSetting& setting);

/// Appends the block that makes a thumbnail from a copy of the largest one.
void AddMiddleOutput(VELAUtils::ProcessRunner& runner, const PhotoThumbSetting& setting);

/// Appends the options and the output file of the last thumbnail.
void AddLastOutput(VELAUtils::ProcessRunner& runner, const PhotoThumbSetting& setting);
