// The inputs of the comparison.
#pragma once

#include <functional>
#include <ostream>
#include <string>
#include <vector>

namespace vela_test {

/// One input and the argument sets for it.
struct LikenessSource {
  std::string format;       ///< common name
  std::string description;  ///< its special property; unique within the format
  std::string extension;    ///< of its file
  /// Makes the file.
  std::function<void(const std::string& path)> make;
  /// By name, see vectors.h.
  std::vector<std::string> vectors;
  /// Thumbnails of the usual sizes; otherwise of smaller ones, because most inputs are small.
  bool isLarge = false;
  /// Whether "[0]" is appended to its name.
  bool firstPage = false;
};

/// For messages of failed comparisons.
void PrintTo(const LikenessSource& source, std::ostream* out);

/// Letters, digits and underscores only.
std::string TestNameOf(const LikenessSource& source);

std::vector<LikenessSource> JpegSources();
std::vector<LikenessSource> PngSources();
std::vector<LikenessSource> TiffSources();
std::vector<LikenessSource> AnimationSources();   ///< GIF and WebP
std::vector<LikenessSource> OtherSources();       ///< all other formats
std::vector<LikenessSource> DamagedSources();     ///< of every format
std::vector<LikenessSource> CameraFileSources();  ///< from a folder with real files; may be empty

}  // namespace vela_test
