// Test photos: four quadrants in distinct colours, so that the orientation of a picture can be read
// from its pixels.
#pragma once

#include <string>

namespace vela_test {

enum class JpegColour { kRgb, kGrey, kCmyk };

/// A JPEG to make.
struct JpegRecipe {
  int width = 64;
  int height = 48;
  JpegColour colour = JpegColour::kRgb;
  int quality = 90;
  int orientation = 0;      ///< EXIF orientation 1 to 8, 0: no such tag
  bool exif = false;        ///< camera make and date (implied by `orientation`)
  bool xmp = false;         ///< an XMP packet with a title
  bool iptc = false;        ///< an IPTC block with a caption
  bool iccProfile = false;  ///< an embedded sRGB profile
  std::string comment;      ///< JPEG comment, none when empty
};

/// The JPEG's bytes: the picture, and the colour profile if the recipe has one, without the
/// recipe's other metadata.
std::string EncodeJpeg(const JpegRecipe& recipe);

/// Makes the JPEG; the quadrants as stored read "RGBY". Returns `path`.
std::string MakeJpeg(const std::string& path, const JpegRecipe& recipe = JpegRecipe());

/// A JPEG whose data ends in the middle. Returns `path`.
std::string MakeTruncatedJpeg(const std::string& path, int width = 256, int height = 192);

/// A PNG whose left half is opaque (red above blue) and whose right half is fully transparent.
std::string MakeTransparentPng(const std::string& path, int width = 64, int height = 48);

/// A GIF of `frames` frames: the first in quadrants, each later one a plain grey.
std::string MakeAnimatedGif(const std::string& path, int frames = 3, int width = 64,
                            int height = 48);

/// A TIFF of `pages` pages: the first in quadrants, each later one a plain grey.
std::string MakeMultiPageTiff(const std::string& path, int pages = 2, int width = 64,
                              int height = 48);

/// Any format ImageMagick writes, chosen by the extension, in quadrants.
std::string MakeImage(const std::string& path, int width = 64, int height = 48);

/// A binary PPM in quadrants.
std::string MakePpm(const std::string& path, int width = 64, int height = 48);

/// An sRGB colour profile as files embed it.
std::string SrgbProfile();

}  // namespace vela_test
