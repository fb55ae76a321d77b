// The known differences from ImageMagick, and why they are acceptable.
#pragma once

#include <string>

namespace vela_test {

enum class LikenessException {
  kNone,
  kSucceeds,      ///< ours succeeds, ImageMagick fails
  kFails,         ///< ours fails, ImageMagick succeeds
  kOtherPicture,  ///< the pictures are of the same size but not alike
  kUpright,       ///< ours is upright, ImageMagick's is not rotated
  kSurroundings,  ///< something other than the pixels differs
};

struct KnownDifference {
  LikenessException kind = LikenessException::kNone;
  std::string why;
  double leastDecibels = 0;  ///< kOtherPicture: how similar the pictures are nevertheless
};

/// The known difference of an input (its format and description) with a vector.
KnownDifference KnownDifferenceOf(const std::string& format, const std::string& description,
                                  const std::string& vector);

}  // namespace vela_test
