// A decoded thumbnail, and how similar two of them are.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace vela_test {

struct OutputPicture {
  int width = 0;
  int height = 0;
  int components = 0;
  std::string sampling;  ///< of each component, such as "2x2,1x1,1x1"
  std::string density;   ///< such as "72x72 unit 1"
  std::string profile;   ///< the embedded colour profile's bytes, empty when there is none
  std::string metadata;  ///< names of other data in the file, such as "exif "
  std::vector<uint8_t> samples;
};

/// Reads a JPEG; empty unless it is complete.
std::optional<OutputPicture> ReadOutputPicture(const std::string& path);

/// The likeness of two pictures with the same pixels, decibels.
constexpr double kSamePixels = 99;

/// Peak signal-to-noise ratio of two pictures of the same size and number of components, decibels;
/// never more than kSamePixels.
double Decibels(const OutputPicture& one, const OutputPicture& other);

/// Lists differences other than the pixels, such as "sampling 2x2,1x1,1x1 for 1x1,1x1,1x1; "; empty
/// when nothing does.
std::string Differences(const OutputPicture& ours, const OutputPicture& theirs);

}  // namespace vela_test
