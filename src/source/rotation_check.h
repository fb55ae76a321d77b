// Detects the rotation that a user gave a photo's thumbnails.
#pragma once

#include <string>

#include "profiles/directory_job.h"

/// Finds the turn (0, 90, 180 or 270 degrees clockwise) at which thumbnails made from `photoPath`
/// match the existing ones in its metadata directory `thumbDir`; 0 when it is unknown. Removes its
/// trial images.
int DetectThumbRotation(const DirectoryJob& job, const std::string& photoPath,
                        const std::string& thumbDir);

/// Returns the integer part of the mean absolute error between two images, or 65535 when it cannot
/// be measured; a tool that cannot be started is logged.
int CompareImagesMAE(const std::string& imageA, const std::string& imageB);
