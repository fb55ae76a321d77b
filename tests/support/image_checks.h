// Reads images back to check them.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace vela_test {

struct Rgb {
  int red = 0;
  int green = 0;
  int blue = 0;
};

/// A decoded JPEG.
class DecodedImage {
 public:
  DecodedImage(int width, int height, int components, std::vector<uint8_t> pixels);

  int Width() const { return width_; }
  int Height() const { return height_; }
  /// Components as stored: 1 grey, 3 colour, 4 CMYK.
  int Components() const { return components_; }
  /// Colour at a relative position, 0 to 1 from the left and from the top.
  Rgb At(double x, double y) const;

 private:
  int width_;
  int height_;
  int components_;
  std::vector<uint8_t> pixels_;  // RGB
};

/// Decodes a JPEG; empty unless the file is one complete JPEG and nothing else (a warning of the
/// decoder, missing data and bytes after the end are failures); `why`, when given, receives the
/// reason.
std::optional<DecodedImage> DecodeJpeg(const std::string& path, std::string* why = nullptr);

/// Whether DecodeJpeg accepts the file.
bool IsWholeJpeg(const std::string& path);

/// The colours of the quadrants, top left, top right, bottom left, bottom right: R red, G green,
/// B blue, Y yellow, W white, K black, E grey; "RGBY" is upright. Empty when the file is not a
/// whole JPEG.
std::string QuadrantLetters(const std::string& path);

/// The letters of a stored "RGBY" after the orientation tag (1 to 8) has been applied.
std::string LettersAfterOrientation(int orientation);

/// The letters of "RGBY" after a clockwise turn by 0, 90, 180 or 270 degrees.
std::string LettersAfterTurn(int degrees);

/// The contents of a JPEG besides its picture.
struct JpegMetadata {
  bool exif = false;
  bool xmp = false;
  bool iptc = false;
  bool icc = false;
  bool comment = false;
  int orientation = 0;  ///< EXIF orientation, 0 when there is none
};
JpegMetadata ReadJpegMetadata(const std::string& path);

/// Output of ImageMagick's identify for a file's first picture.
struct ImageIdentity {
  std::string format;  ///< "JPEG", "PNG", ...; empty when it is no image
  int width = 0;
  int height = 0;
  int frames = 0;
};
ImageIdentity Identify(const std::string& path);

}  // namespace vela_test
