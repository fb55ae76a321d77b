// Reads what matters for thumbnails from EXIF data.
#pragma once

#include <cstddef>
#include <cstdint>

#include "decoding/photo_traits.h"

namespace vela {

/// Takes orientation and density from the data of an APP1 segment, "Exif" marking included, into
/// `traits`; leaves alone what the data does not say.
void TakeExifTraits(const uint8_t* data, size_t size, PhotoTraits& traits);

}  // namespace vela
