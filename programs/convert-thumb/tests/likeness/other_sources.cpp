// The formats that are neither JPEG, PNG, TIFF, GIF nor WebP.

#include "likeness/makers.h"
#include "likeness/profiles.h"
#include "likeness/source.h"
#include "likeness/vectors.h"

namespace vela_test {
namespace {

LikenessSource Netpbm(const std::string& says, const char* extension, FileMaker make) {
  return {"Netpbm", says, extension, std::move(make), {kSix, kFill, kTurned, kBare}};
}

LikenessSource Heif(const std::string& says, const char* extension, FileMaker make) {
  return {"HEIF", says, extension, std::move(make), {kSix, kFill, kBare}};
}

LikenessSource Other(const std::string& format, const std::string& says, const char* extension,
                     FileMaker make) {
  return {format, says, extension, std::move(make), {kSix, kFill}};
}

/// ImageMagick's picture of all layers with inks depends on what its memory held before.
LikenessSource FirstLayer(LikenessSource source) {
  source.firstPage = true;
  return source;
}

LikenessSource LargeRaw() {
  // What a decoded camera raw looks like.
  LikenessSource source =
      Netpbm("PPM, 16 bits, 6 megapixels", "ppm", Written({"-depth", "16"}, {3000, 2000}));
  source.isLarge = true;
  source.vectors = {kSix};
  return source;
}

}  // namespace

std::vector<LikenessSource> OtherSources() {
  return {
      Netpbm("PPM", "ppm", Written({"-depth", "8"})),
      Netpbm("PPM, 16 bits", "ppm", Written({"-depth", "16"})),
      Netpbm("PPM, text", "ppm", Written({"-depth", "8", "-compress", "None"}, {320, 240})),
      LargeRaw(),
      Netpbm("PGM", "pgm", Written({"-depth", "8"})),
      Netpbm("PBM", "pbm", Written({})),
      Netpbm("PPM, 20000 x 12", "ppm", Raw({20000, 12})),
      Netpbm("PPM, 1 x 1", "ppm", Written({"-depth", "8"}, {1, 1})),
      Heif("HEIC", "heic", Written({"-quality", "80"})),
      Heif("HEIC, display RGB profile", "heic", WrittenWithProfile({}, DisplayRgbProfile)),
      Heif("HEIC, alpha", "heic", WrittenWithAlpha({"-quality", "80"})),
      Heif("AVIF", "avif", Written({"-quality", "60"})),
      Other("BMP", "24 bits", "bmp", Written({"-depth", "8"})),
      Other("BMP", "palette", "bmp", Written({"-colors", "200", "-type", "Palette"})),
      Other("PSD", "8 bits", "psd", Written({"-depth", "8"})),
      FirstLayer(Other("PSD", "CMYK", "psd", Written({"-depth", "8", "-colorspace", "CMYK"}))),
      Other("JPEG 2000", "lossy", "jp2", Written({"-depth", "8", "-quality", "40"})),
      Other("TGA", "24 bits", "tga", Written({"-depth", "8"})),
  };
}

}  // namespace vela_test
