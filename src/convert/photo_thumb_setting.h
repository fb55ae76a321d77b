// One image to make from one source photo.
#pragma once

#include <cstdint>
#include <string>

/// Describes one output of a converter run. Lengths are in pixels, angles in degrees clockwise.
struct PhotoThumbSetting {
  std::string srcPath;        ///< the source photo
  std::string destPath;       ///< path of the finished thumbnail
  std::string outDir;         ///< directory of the thumbnail and of the converter's scratch files
  std::string tempPath;       ///< path that the converter writes to, set when added to a job
  bool fillArea = false;      ///< fill the box instead of fitting into it
  int32_t width = 320;        ///< box width
  int32_t height = 320;       ///< box height
  int32_t quality = 90;       ///< JPEG quality
  bool stripProfiles = true;  ///< drop embedded profiles except the colour profile
  bool flatten = true;        ///< flatten layers onto the background
  bool autoOrient = false;    ///< turn upright by the orientation tag
  int32_t rotate = -1;        ///< applied when greater than 0
  std::string unsharp;        ///< unsharp-mask argument, empty for none
  std::string colorspace = "sRGB";

  PhotoThumbSetting() = default;
  PhotoThumbSetting(const PhotoThumbSetting&) = default;

  /// Copies everything but `fillArea`: sorting a job moves its settings by assignment, and the fill
  /// mode belongs to the position in the job, not to the setting that ends up there.
  PhotoThumbSetting& operator=(const PhotoThumbSetting& other);

  ~PhotoThumbSetting() = default;
};
