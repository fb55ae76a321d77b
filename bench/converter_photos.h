// The photos of the converter's benchmark.
#pragma once

#include <string>
#include <vector>

namespace vela_bench {

struct BenchPhoto {
  const char* says;
  int width;              ///< pixels
  int height;             ///< pixels
  const char* extension;  ///< and so the format
  bool progressive;       ///< JPEG only
};

/// Baseline JPEGs from the smallest to the largest.
std::vector<BenchPhoto> BaselinePhotos();

/// The other kinds.
std::vector<BenchPhoto> OtherPhotos();

bool IsJpeg(const BenchPhoto& photo);

/// Makes the photo in `directory` unless it is there; returns its path.
std::string MakePhoto(const BenchPhoto& photo, const std::string& directory);

}  // namespace vela_bench
