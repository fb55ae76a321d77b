// Makes the thumbnails of one photo.
#pragma once

#include <cstddef>

#include "command_line/conversion_plan.h"
#include "decoding/photo_reader.h"

namespace vela {

/// Returns true when this program can make the outputs of a photo with these traits. A JPEG cannot
/// store transparency, which has to be flattened first, and only some colour spaces, so that others
/// have to be converted.
bool CanMakeThumbnails(const PhotoTraits& traits, const ConversionPlan& plan);

/// Makes all outputs of `plan` from a reader that has read the header. Returns false, after a call
/// of ReportFailure, when the photo cannot be decoded, needs more than about `memoryLimit` bytes in
/// addition to those of the decoder, or when an output cannot be written completely.
bool MakeThumbnails(PhotoReader& reader, const ConversionPlan& plan, size_t memoryLimit);

}  // namespace vela
