// Resource limits of ImageMagick.
#pragma once

#include <cstddef>

namespace vela {

/// Sets limits in the environment that make ImageMagick keep a picture in files, instead of running
/// out of memory, well before it uses `memoryLimit` bytes. Existing lower limits stay. Keeps it
/// from starting threads when there is not enough memory for their stacks.
void LimitImageMagick(size_t memoryLimit);

/// Sets limits in the environment that make ImageMagick fail instead of keeping a picture in files.
void KeepImageMagickFromUsingFiles();

}  // namespace vela
