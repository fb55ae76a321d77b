// The orientation in the EXIF data of an image.
#pragma once

#include <cstdio>

#include "header/header_question.h"

namespace vela {

/// Writes the library's text for the orientation of the image in `file` into `text`, nothing when
/// its EXIF data has none. Returns false when there is no EXIF data.
bool ReadOrientation(FILE* file, char (&text)[kOrientationTextSize]);

}  // namespace vela
