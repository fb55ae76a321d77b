// The one list of what is known to differ from ImageMagick, and why that is all right.
#pragma once

#include <string>

namespace vela_test {

enum class LikenessException {
  kNone,
  kSucceeds,      ///< we make thumbnails where ImageMagick fails
  kFails,         ///< we make none where ImageMagick does
  kUpright,       ///< ours stands upright where ImageMagick's lies on its side
  kSurroundings,  ///< something beside the pixels differs
};

struct KnownDifference {
  LikenessException kind = LikenessException::kNone;
  std::string why;
};

/// What is known of an input (its format and what it says of itself) with a vector.
KnownDifference KnownDifferenceOf(const std::string& format, const std::string& says,
                                  const std::string& vector);

}  // namespace vela_test
