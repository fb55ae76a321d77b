// The EXIF data that affects thumbnails.
#pragma once

#include <cstddef>
#include <cstdint>

#include "picture/photo_traits.h"

namespace vela {

/// Stores the orientation and density of an APP1 segment, which starts with "Exif", in `traits`.
/// Values that the data does not contain are unchanged.
void ReadExifTraits(const uint8_t* data, size_t size, PhotoTraits& traits);

}  // namespace vela
