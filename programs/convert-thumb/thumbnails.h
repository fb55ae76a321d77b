// Makes the thumbnails of one photo.
#pragma once

#include <cstddef>

#include "conversion_plan.h"
#include "jpeg_reader.h"

/// Makes all outputs of `plan` from a reader whose header has been read. False, with one line on
/// standard error, when the photo cannot be decoded, would take more than about `memoryLimit` bytes
/// besides the decoder's, or an output cannot be written whole.
bool MakeThumbnails(JpegReader& reader, const ConversionPlan& plan, size_t memoryLimit);
