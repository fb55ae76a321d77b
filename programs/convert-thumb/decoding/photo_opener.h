// Chooses the decoder of a photo.
#pragma once

#include <cstddef>
#include <memory>

#include "command_line/conversion_plan.h"
#include "decoding/photo_reader.h"

namespace vela {

/// Returns a reader that has read the header of the photo; null when the photo has to be left to
/// ImageMagick. `descriptor`: the plan's source, open as long as the reader is used. `memoryLimit`:
/// bytes that the decoder may use.
std::unique_ptr<PhotoReader> OpenPhoto(int descriptor, const ConversionPlan& plan,
                                       size_t memoryLimit);

}  // namespace vela
