// The tasks that a command line can request, as plain values.
#pragma once

#include <string>
#include <vector>

#include "picture/thumbnail_size.h"
#include "picture/unsharp.h"

namespace vela {

/// One change of the picture after scaling.
struct Step {
  enum class Kind { kFlatten, kAutoOrient, kTurn, kSharpen, kConvertToSrgb };
  Kind kind = Kind::kFlatten;
  int quarterTurns = 0;  ///< kTurn: clockwise, 0 to 3
  UnsharpMask unsharp;   ///< kSharpen
};

/// One thumbnail to make.
struct OutputPlan {
  ThumbnailBox box;
  std::vector<Step> steps;  ///< in this order, after scaling
  int quality = 0;          ///< of the JPEG, 1 to 100
  std::string path;
};

/// The thumbnails of one photo: the first is made from the photo, all others from the first.
struct ConversionPlan {
  std::string source;
  bool firstPageOnly = false;       ///< ignore further pages of the source
  std::vector<OutputPlan> outputs;  ///< at least one
};

/// A file to be turned in place.
struct TurnPlan {
  std::string path;
  int quarterTurns = 0;  ///< clockwise, 1 to 3
};

}  // namespace vela
