// Finds the decoder of a photo.
#pragma once

#include <cstddef>
#include <memory>

#include "command_line/conversion_plan.h"
#include "decoding/photo_reader.h"

namespace vela {

/// A reader of the photo under `descriptor`, which is the plan's source and stays open as long as
/// the reader is used; its header has been read. Null when the outputs of such a photo are
/// ImageMagick's work. `memoryLimit`: bytes that the decoder may use.
std::unique_ptr<PhotoReader> OpenPhoto(int descriptor, const ConversionPlan& plan,
                                       size_t memoryLimit);

}  // namespace vela
