// Camera raw photos: small digital negatives with a colour filter array, as cameras store them.
#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include "support/images.h"

namespace vela_test {

/// A raw photo to make.
struct RawRecipe {
  int width = 64;                           ///< even
  int height = 48;                          ///< even
  int orientation = 0;                      ///< how the camera was held, 1 to 8; 0: not stated
  std::optional<JpegRecipe> preview;        ///< the embedded preview, none when not set
  size_t previewBytes = std::string::npos;  ///< of the preview no more than this many are stored
  std::optional<int>
      rotation;  ///< degrees that exiftool gives as "Rotation", not stated when empty
};

/// Makes the raw photo (a DNG regardless of the name); full decode and preview both show the
/// quadrants, as stored "RGBY". Returns `path`.
std::string MakeRawPhoto(const std::string& path, const RawRecipe& recipe = RawRecipe());

}  // namespace vela_test
