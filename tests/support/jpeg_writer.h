// Encodes the test picture as JPEG in this process, which is faster than a run of ImageMagick.
#pragma once

#include <string>

#include "support/images.h"

namespace vela_test {

/// The file's bytes: the picture, and the colour profile when the recipe has one. The rest of the
/// recipe's metadata is not in it.
std::string EncodeJpeg(const JpegRecipe& recipe);

}  // namespace vela_test
