// Makes the thumbnails of one photo.
#pragma once

#include <cstddef>

#include "command_line/conversion_plan.h"
#include "decoding/photo_reader.h"

namespace vela {

/// Whether the outputs of a photo with these traits are made here. Transparency that is not
/// flattened at once, and colours that are not converted, would have to be stored as they are.
bool CanMakeThumbnails(const PhotoTraits& traits, const ConversionPlan& plan);

/// Makes all outputs of `plan` from a reader whose header has been read. False, with one line on
/// standard error, when the photo cannot be decoded, would take more than about `memoryLimit` bytes
/// besides the decoder's, or an output cannot be written whole.
bool MakeThumbnails(PhotoReader& reader, const ConversionPlan& plan, size_t memoryLimit);

}  // namespace vela
