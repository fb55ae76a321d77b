// Pixel size of an image file.
#pragma once

#include <cstdint>
#include <cstdio>

namespace vela {

/// Prepares the parsers; called once, before the first call of ReadImageSize.
void InitializeImageLibrary();

/// Reads the size in pixels, as stored, of the image in `file`, without decoding it. Returns false
/// (sizes untouched) when there is none or it does not fit.
bool ReadImageSize(FILE* file, uint32_t& width, uint32_t& height);

}  // namespace vela
