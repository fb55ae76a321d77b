// The keys of a section of the profile file, and the values that the converter supports.
#pragma once

#include <optional>
#include <string_view>

namespace vela {

/// A section defines a thumbnail when its name begins with this.
inline constexpr std::string_view kThumbSectionPrefix = "thumb";
inline constexpr bool IsThumbSection(std::string_view name) {
  return name.substr(0, kThumbSectionPrefix.size()) == kThumbSectionPrefix;
}

inline constexpr char kSizeKey[] = "size";
inline constexpr char kQualityKey[] = "quality";
inline constexpr char kUnsharpKey[] = "unsharp";
inline constexpr char kFilenameKey[] = "filename";
inline constexpr char kPhaseKey[] = "phase";

inline constexpr int kDefaultSize = 120;
inline constexpr int kDefaultQuality = 80;
inline constexpr int kDefaultPhase = 0;

/// Supported by the converter itself; it leaves other values to ImageMagick.
inline constexpr int kMaxSide = 65535;  ///< pixels
inline constexpr int kMinQuality = 1;
inline constexpr int kMaxQuality = 100;

/// The later phases; every other one is phase 0.
inline constexpr int kMaxPhase = 2;

/// Parameters of the sharpening.
struct UnsharpMask {
  double radius = 0;        ///< pixels; 0: derived from `sigma`
  double sigma = 1;         ///< pixels, positive
  double amount = 1;        ///< factor of the difference that is added
  double threshold = 0.05;  ///< smallest difference that is added, as a share of the full range
};

/// Parses "RADIUS[xSIGMA][+AMOUNT][+THRESHOLD]" in decimal fractions; missing parts have the
/// defaults of UnsharpMask. Empty for any other text and for values out of the supported range.
std::optional<UnsharpMask> ParseUnsharpMask(std::string_view text);

}  // namespace vela
