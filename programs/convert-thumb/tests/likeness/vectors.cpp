#include "likeness/vectors.h"

namespace vela_test {
namespace {

std::vector<int> Sides(const std::string& vector, bool large) {
  if (vector == kSix) {
    return large ? std::vector<int>{1280, 800, 640, 320, 160, 120}
                 : std::vector<int>{480, 320, 240, 160, 120, 80};
  }
  if (vector == kSingle) {
    return {large ? 320 : 160};
  }
  if (vector == kSmall) {
    return {large ? 120 : 60};
  }
  if (vector == kMiddle) {
    return {large ? 800 : 240};
  }
  return large ? std::vector<int>{1280, 320} : std::vector<int>{400, 120};
}

ThumbOptions Usual(int side) {
  ThumbOptions options;
  options.width = side;
  options.height = side;
  options.flatten = true;
  options.unsharp = "0x0.6+0.7+0.01";
  return options;
}

void Adapt(const std::string& vector, ThumbOptions& options) {
  if (vector == kFill) {
    options.fill = true;
    options.unsharp.clear();
  } else if (vector == kTurned) {
    options.rotate = 90;
  } else if (vector == kBare) {
    options.stripProfiles = false;
    options.flatten = false;
    options.unsharp.clear();
    options.convertToSrgb = false;
  }
}

}  // namespace

std::vector<std::string> UsualVectors() {
  return {kSix, kFill, kTurned, kSingle, kBare};
}

std::vector<std::string> PhotographVectors() {
  return {kSix, kFill, kTurned, kSingle, kSmall, kMiddle, kBare};
}

std::vector<ThumbOptions> OutputsOf(const std::string& vector, bool large) {
  std::vector<ThumbOptions> outputs;
  for (const int side : Sides(vector, large)) {
    outputs.push_back(Usual(side));
    Adapt(vector, outputs.back());
  }
  outputs.front().quality = 90;
  return outputs;
}

}  // namespace vela_test
