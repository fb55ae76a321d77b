#include "likeness/photo.h"

#include <algorithm>
#include <cmath>

namespace vela_test {
namespace {

constexpr double kBrightest = 65535;

uint32_t Scrambled(uint32_t value) {
  value ^= value >> 16;
  value *= 0x7feb352dU;
  value ^= value >> 15;
  value *= 0x846ca68bU;
  return value ^ value >> 16;
}

/// A random number from 0 to 1, the same for the same point.
double RandomAt(int x, int y, uint32_t field) {
  const uint32_t point = static_cast<uint32_t>(x) * 0x9e3779b1U + static_cast<uint32_t>(y);
  return Scrambled(point ^ Scrambled(field)) / 4294967295.0;
}

double Between(double from, double to, double share) {
  return from + (to - from) * share;
}

/// Random heights on a grid with cells of this many pixels, joined smoothly.
double Hills(int x, int y, int cell, uint32_t field) {
  const int column = x / cell;
  const int row = y / cell;
  const double right = static_cast<double>(x % cell) / cell;
  const double down = static_cast<double>(y % cell) / cell;
  const double upper =
      Between(RandomAt(column, row, field), RandomAt(column + 1, row, field), right);
  const double lower =
      Between(RandomAt(column, row + 1, field), RandomAt(column + 1, row + 1, field), right);
  return Between(upper, lower, down);
}

/// A sum of hills of several sizes, from 0 to 1.
double Landscape(int x, int y) {
  double sum = 0;
  double weights = 0;
  double weight = 1;
  for (int cell = 256; cell >= 4; cell /= 4) {
    sum += weight * Hills(x, y, cell, static_cast<uint32_t>(cell));
    weights += weight;
    weight *= 0.45;
  }
  return sum / weights;
}

/// A disc and a fence, so that there are edges in every direction.
double Shape(const Samples& picture, int x, int y) {
  const double acrossX = static_cast<double>(x) / picture.width;
  const double acrossY = static_cast<double>(y) / picture.height;
  if (std::hypot(acrossX - 0.3, acrossY - 0.4) < 0.18) {
    return 0.25;
  }
  const bool isFence = acrossY > 0.75 && std::fmod(acrossX * 23 + acrossY * 3, 1.0) < 0.3;
  return isFence ? -0.3 : 0;
}

uint16_t Sample(double value) {
  return static_cast<uint16_t>(std::lround(std::clamp(value, 0.0, 1.0) * kBrightest));
}

/// Opaque at the left, soft towards the right, and a hole.
double Opacity(const Samples& picture, int x, int y) {
  const double acrossX = static_cast<double>(x) / picture.width;
  const double acrossY = static_cast<double>(y) / picture.height;
  if (std::hypot(acrossX - 0.7, acrossY - 0.3) < 0.15) {
    return 0;
  }
  return std::clamp(1.6 - 1.4 * acrossX, 0.0, 1.0);
}

void AppendPixel(Samples& picture, int x, int y) {
  const double light = Landscape(x, y) + Shape(picture, x, y);
  const double warmth = Hills(x, y, 200, 1001) - 0.5;
  const double green = Hills(x, y, 130, 1002) - 0.5;
  const double grain = (RandomAt(x, y, 1003) - 0.5) * 0.03;
  picture.values.push_back(Sample(light + 0.35 * warmth + grain));
  picture.values.push_back(Sample(light + 0.2 * green + grain));
  picture.values.push_back(Sample(light - 0.35 * warmth + grain));
  if (picture.channels == 4) {
    picture.values.push_back(Sample(Opacity(picture, x, y)));
  }
}

}  // namespace

Samples MakePhotoSamples(int width, int height, int channels) {
  Samples picture{width, height, channels, {}};
  picture.values.reserve(static_cast<size_t>(width) * static_cast<size_t>(height) *
                         static_cast<size_t>(channels));
  for (int y = 0; y < height; ++y) {
    for (int x = 0; x < width; ++x) {
      AppendPixel(picture, x, y);
    }
  }
  return picture;
}

std::string PamOf(const Samples& samples) {
  std::string file = "P7\nWIDTH " + std::to_string(samples.width) + "\nHEIGHT " +
                     std::to_string(samples.height) + "\nDEPTH " +
                     std::to_string(samples.channels) + "\nMAXVAL 65535\nTUPLTYPE " +
                     (samples.channels == 4 ? "RGB_ALPHA" : "RGB") + "\nENDHDR\n";
  file.reserve(file.size() + samples.values.size() * 2);
  for (const uint16_t value : samples.values) {
    file += static_cast<char>(value >> 8);
    file += static_cast<char>(value & 0xff);
  }
  return file;
}

}  // namespace vela_test
