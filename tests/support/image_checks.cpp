#include "support/image_checks.h"

#include <algorithm>
#include <cstdio>
#include <utility>

#include "support/program.h"
#include "support/quadrants.h"
#include "support/sandbox.h"

namespace vela_test {

namespace {

constexpr size_t kRgbParts = 3;

int Squared(int value) {
  return value * value;
}

char NearestLetter(const Rgb& colour) {
  const auto distance = [&colour](const NamedColour& named) {
    return Squared(colour.red - named.rgb[0]) + Squared(colour.green - named.rgb[1]) +
           Squared(colour.blue - named.rgb[2]);
  };
  return std::min_element(
             kNamedColours.begin(), kNamedColours.end(),
             [&](const NamedColour& a, const NamedColour& b) { return distance(a) < distance(b); })
      ->letter;
}

int PlaceAt(double relative, int length) {
  return std::clamp(static_cast<int>(relative * length), 0, length - 1);
}

}  // namespace

DecodedImage::DecodedImage(int width, int height, int components, std::vector<uint8_t> pixels)
    : width_(width), height_(height), components_(components), pixels_(std::move(pixels)) {}

Rgb DecodedImage::At(double x, double y) const {
  const size_t row = static_cast<size_t>(PlaceAt(y, height_));
  const size_t column = static_cast<size_t>(PlaceAt(x, width_));
  const uint8_t* pixel = pixels_.data() + (row * static_cast<size_t>(width_) + column) * kRgbParts;
  return {pixel[0], pixel[1], pixel[2]};
}

std::string QuadrantLetters(const std::string& path) {
  const std::optional<DecodedImage> image = DecodeJpeg(path);
  std::string letters;
  if (image) {
    for (const double y : {0.25, 0.75}) {
      for (const double x : {0.25, 0.75}) {
        letters += NearestLetter(image->At(x, y));
      }
    }
  }
  return letters;
}

std::string LettersAfterOrientation(int orientation) {
  // Top left, top right, bottom left, bottom right once the tag has been applied.
  static const char* const kLetters[] = {"RGBY", "GRYB", "YBGR", "BYRG",
                                         "RBGY", "BRYG", "YGBR", "GYRB"};
  const bool isKnown = orientation >= 1 && orientation <= 8;
  return kLetters[isKnown ? orientation - 1 : 0];
}

std::string LettersAfterTurn(int degrees) {
  switch (degrees) {
    case 90:
      return "BRYG";
    case 180:
      return "YBGR";
    case 270:
      return "GYRB";
    default:
      return "RGBY";
  }
}

ImageIdentity Identify(const std::string& path) {
  const ProgramResult result =
      RunProgram(HostPath("/usr/bin/identify"), {"-format", "%m %w %h %n\n", path});
  ImageIdentity identity;
  char format[16] = "";
  if (result.exitCode == 0 &&
      std::sscanf(result.out.c_str(), "%15s %d %d %d", format, &identity.width, &identity.height,
                  &identity.frames) == 4) {
    identity.format = format;
  }
  return identity;
}

}  // namespace vela_test
