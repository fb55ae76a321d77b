// The photos for the benchmark of the converter.
#pragma once

#include <string>
#include <vector>

namespace vela_bench {

struct BenchPhoto {
  const char* description;
  int width;              ///< pixels
  int height;             ///< pixels
  const char* extension;  ///< selects the format
  bool progressive;       ///< JPEG only
};

/// Baseline JPEGs from the smallest to the largest.
std::vector<BenchPhoto> BaselinePhotos();

/// Progressive JPEGs and other formats.
std::vector<BenchPhoto> OtherPhotos();

bool IsJpeg(const BenchPhoto& photo);

/// Creates the photo in `directory` unless it exists; returns its path.
std::string MakePhoto(const BenchPhoto& photo, const std::string& directory);

}  // namespace vela_bench
