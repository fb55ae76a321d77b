// What a command line asks for, as plain values.
#pragma once

#include <string>
#include <vector>

namespace vela {

/// The box that a thumbnail is scaled to; a picture that is smaller keeps its size.
struct ThumbnailBox {
  int width = 0;      ///< pixels, at least 1
  int height = 0;     ///< pixels, at least 1
  bool fill = false;  ///< the box is a minimum for both sides, not a maximum
};

/// Parameters of the sharpening.
struct UnsharpMask {
  double radius = 0;        ///< pixels; 0: chosen from `sigma`
  double sigma = 1;         ///< pixels, more than 0
  double amount = 1;        ///< share of the difference that is added
  double threshold = 0.05;  ///< share of the whole range that a difference has to reach
};

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

/// A whole run: the first thumbnail is made from the source, every other one from the first.
struct ConversionPlan {
  std::string source;
  bool firstPageOnly = false;       ///< any further pages of the source are left alone
  std::vector<OutputPlan> outputs;  ///< at least one
};

}  // namespace vela
