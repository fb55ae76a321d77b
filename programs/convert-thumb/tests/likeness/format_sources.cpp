// Inputs of every format but JPEG.
#include "likeness/makers.h"
#include "likeness/profiles.h"
#include "likeness/source.h"
#include "likeness/vectors.h"
#include "support/build_paths.h"

namespace vela_test {
namespace {

// PNG

LikenessSource Png(const std::string& description, FileMaker make) {
  return {"PNG", description, "png", std::move(make), {kSix, kFill, kTurned, kBare}};
}

LikenessSource LargePng(LikenessSource source) {
  source.isLarge = true;
  source.vectors = {kSix, kSingle};
  return source;
}

void AddPngDepths(std::vector<LikenessSource>& sources) {
  sources.push_back(Png("8 bits", Written({"-depth", "8"})));
  sources.push_back(Png("16 bits", Written({"-depth", "16"})));
  sources.push_back(Png("grey", Written({"-colorspace", "Gray", "-depth", "8"})));
  sources.push_back(Png("grey, 16 bits", Written({"-colorspace", "Gray", "-depth", "16"})));
  sources.push_back(Png("grey, 4 bits", Written({"-colorspace", "Gray", "-depth", "4"})));
  sources.push_back(Png("1 bit", Written({"-monochrome"})));
  sources.push_back(Png("dithered colours",
                        Written({"-dither", "FloydSteinberg", "-posterize", "2", "-depth", "8"})));
  sources.push_back(Png("palette", Written({"-colors", "200", "-define", "png:format=png8"})));
  sources.push_back(
      Png("palette, 4 bits", Written({"-colors", "13", "-depth", "8", "-define", "png:format=png8",
                                      "-define", "png:bit-depth=4"})));
}

void AddPngAlpha(std::vector<LikenessSource>& sources) {
  sources.push_back(Png("alpha", WrittenWithAlpha({"-depth", "8"})));
  sources.push_back(Png("alpha, 16 bits", WrittenWithAlpha({"-depth", "16"})));
  sources.push_back(
      Png("grey with alpha", WrittenWithAlpha({"-colorspace", "Gray", "-depth", "8"})));
  sources.push_back(Png("transparent", Written({"-depth", "8", "-alpha", "transparent"})));
  sources.push_back(Png("opaque alpha", Written({"-depth", "8", "-define", "png:color-type=6"})));
  sources.push_back(
      Png("palette with alpha", WrittenWithAlpha({"-channel", "A", "-threshold", "50%", "+channel",
                                                  "-colors", "60", "-define", "png:format=png8"})));
}

void AddPngChunks(std::vector<LikenessSource>& sources) {
  sources.push_back(Png("interlaced", Written({"-depth", "8", "-interlace", "Plane"})));
  sources.push_back(Png("wide RGB profile", WrittenWithProfile({"-depth", "8"}, WideRgbProfile)));
  sources.push_back(Png("gamma 0.6", WithGamma(60000)));
  sources.push_back(Png("gamma and primaries",
                        Written({"-depth", "8", "-define", "png:include-chunk=gAMA,cHRM"})));
  sources.push_back(
      Png("no chunk but the data", Written({"-depth", "8", "-define", "png:exclude-chunk=all"})));
  sources.push_back(Png("300 dots per inch",
                        Written({"-depth", "8", "-units", "PixelsPerInch", "-density", "300"})));
  sources.push_back(Png("orientation 6", WithOrientation(6)));
}

/// The format is detected from the data, not from the name.
LikenessSource Misnamed() {
  LikenessSource source = Png("under the name of a JPEG", [](const std::string& path) {
    Written({"-depth", "8"})(path + ".png");
    Copied(path + ".png")(path);
  });
  source.extension = "jpg";
  return source;
}

// TIFF

LikenessSource Tiff(const std::string& description, FileMaker make) {
  return {"TIFF", description, "tif", std::move(make), {kSix, kFill, kBare}};
}

void AddTiffLayouts(std::vector<LikenessSource>& sources) {
  sources.push_back(Tiff("8 bits", Written({"-depth", "8", "-compress", "None"})));
  sources.push_back(Tiff("LZW", Written({"-depth", "8", "-compress", "LZW"})));
  sources.push_back(Tiff("deflate", Written({"-depth", "8", "-compress", "Zip"})));
  sources.push_back(Tiff("JPEG inside", Written({"-depth", "8", "-compress", "JPEG"})));
  sources.push_back(
      Tiff("tiles", Written({"-depth", "8", "-define", "tiff:tile-geometry=128x128"})));
  sources.push_back(Tiff("planes", Written({"-depth", "8", "-interlace", "Plane"})));
  sources.push_back(
      Tiff("big-endian, 16 bits", Written({"-depth", "16", "-define", "tiff:endian=msb"})));
}

void AddTiffDepths(std::vector<LikenessSource>& sources) {
  sources.push_back(Tiff("16 bits", Written({"-depth", "16"})));
  sources.push_back(Tiff("floating point", Written({"-depth", "32", "-compress", "Zip", "-define",
                                                    "quantum:format=floating-point"})));
  sources.push_back(Tiff("grey", Written({"-colorspace", "Gray", "-depth", "8"})));
  sources.push_back(Tiff("grey, 16 bits", Written({"-colorspace", "Gray", "-depth", "16"})));
  sources.push_back(Tiff("palette", Written({"-colors", "200", "-type", "Palette"})));
  sources.push_back(Tiff("1 bit", Written({"-monochrome", "-compress", "None"})));
  sources.push_back(Tiff("fax, group 3", Written({"-monochrome", "-compress", "Fax"})));
  sources.push_back(Tiff("fax, group 4", Written({"-monochrome", "-compress", "Group4"})));
}

void AddTiffColours(std::vector<LikenessSource>& sources) {
  sources.push_back(Tiff("alpha", WrittenWithAlpha({"-depth", "8"})));
  sources.push_back(Tiff("CMYK", Written({"-colorspace", "CMYK", "-depth", "8"})));
  sources.push_back(Tiff("CMYK, ink profile",
                         WrittenWithProfile({"-colorspace", "CMYK", "-depth", "8"}, InkProfile)));
  sources.push_back(Tiff("wide RGB profile", WrittenWithProfile({"-depth", "8"}, WideRgbProfile)));
  sources.push_back(Tiff("Lab", Written({"-colorspace", "Lab", "-depth", "8"})));
}

LikenessSource Pages(const std::string& description, bool firstPage) {
  LikenessSource source =
      Tiff(description, Written({"-depth", "8", "(", "+clone", "-negate", "-resize", "50%", ")"}));
  source.firstPage = firstPage;
  source.vectors = {kSix, kSingle};
  return source;
}

// GIF and WebP

LikenessSource Gif(const std::string& description, FileMaker make) {
  return {"GIF", description, "gif", std::move(make), {kSix, kFill, kBare}};
}

LikenessSource WebP(const std::string& description, FileMaker make) {
  return {"WebP", description, "webp", std::move(make), {kSix, kFill, kTurned, kBare}};
}

LikenessSource Animation(LikenessSource source, bool firstPage) {
  source.firstPage = firstPage;
  source.vectors = {kSix, kSingle};
  return source;
}

FileMaker Frames() {
  return Written({"(", "+clone", "-negate", ")", "(", "+clone", "-flip", ")", "-delay", "20"},
                 {320, 240});
}

// The other formats

LikenessSource Netpbm(const std::string& description, const char* extension, FileMaker make) {
  return {"Netpbm", description, extension, std::move(make), {kSix, kFill, kTurned, kBare}};
}

LikenessSource Heif(const std::string& description, const char* extension, FileMaker make) {
  return {"HEIF", description, extension, std::move(make), {kSix, kFill, kBare}};
}

LikenessSource Other(const std::string& format, const std::string& description,
                     const char* extension, FileMaker make) {
  return {format, description, extension, std::move(make), {kSix, kFill}};
}

/// ImageMagick's picture of all CMYK layers depends on uninitialised memory.
LikenessSource FirstLayer(LikenessSource source) {
  source.firstPage = true;
  return source;
}

LikenessSource LargeRaw() {
  // Like a decoded camera raw file.
  LikenessSource source =
      Netpbm("PPM, 16 bits, 6 megapixels", "ppm", Written({"-depth", "16"}, {3000, 2000}));
  source.isLarge = true;
  source.vectors = {kSix};
  return source;
}

}  // namespace

std::vector<LikenessSource> PngSources() {
  std::vector<LikenessSource> sources;
  AddPngDepths(sources);
  AddPngAlpha(sources);
  AddPngChunks(sources);
  sources.push_back(LargePng(Png("3 megapixels", Written({"-depth", "8"}, {2048, 1536}))));
  sources.push_back(
      LargePng(Png("alpha, 2 megapixels", WrittenWithAlpha({"-depth", "8"}, {1632, 1224}))));
  sources.push_back(Misnamed());
  sources.push_back(Png("1 x 1", Written({"-depth", "8"}, {1, 1})));
  sources.push_back(Png("10 x 2000", Written({"-depth", "8"}, {10, 2000})));
  return sources;
}

std::vector<LikenessSource> TiffSources() {
  std::vector<LikenessSource> sources;
  AddTiffLayouts(sources);
  AddTiffDepths(sources);
  AddTiffColours(sources);
  for (const char* orientation : {"TopRight", "BottomRight", "RightTop", "LeftBottom"}) {
    sources.push_back(Tiff(std::string("orientation ") + orientation,
                           Written({"-depth", "8", "-orient", orientation})));
  }
  sources.push_back(Tiff("300 dots per inch",
                         Written({"-depth", "8", "-units", "PixelsPerInch", "-density", "300"})));
  sources.push_back(Pages("two pages, the first", true));
  sources.push_back(Pages("two pages, all", false));
  sources.push_back(Tiff("1 x 1", Written({"-depth", "8"}, {1, 1})));
  LikenessSource large = Tiff("3 megapixels", Written({"-depth", "8"}, {2048, 1536}));
  large.isLarge = true;
  large.vectors = {kSix};
  sources.push_back(large);
  return sources;
}

std::vector<LikenessSource> AnimationSources() {
  return {
      Gif("one frame", Written({})),
      Gif("interlaced", Written({"-interlace", "Line"})),
      Gif("transparent parts", WrittenWithAlpha({})),
      Gif("grey", Written({"-colorspace", "Gray"})),
      Gif("1 x 1", Written({}, {1, 1})),
      Animation(Gif("animated, the first frame", Frames()), true),
      Animation(Gif("animated, all frames", Frames()), false),
      WebP("lossy", Written({"-quality", "85"})),
      WebP("lossless", Written({"-define", "webp:lossless=true"})),
      WebP("alpha", WrittenWithAlpha({"-quality", "85"})),
      WebP("lossless with alpha", WrittenWithAlpha({"-define", "webp:lossless=true"})),
      WebP("grey", Written({"-colorspace", "Gray"})),
      WebP("orientation 6", WithOrientation(6)),
      WebP("display RGB profile", WrittenWithProfile({}, DisplayRgbProfile)),
      WebP("1 x 1", Written({}, {1, 1})),
      Animation(WebP("animated, the first frame", Frames()), true),
      Animation(WebP("animated, all frames", Frames()), false),
  };
}

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

std::vector<LikenessSource> CameraFileSources() {
  const std::string media = SharedMediaDirectory();
  if (media.empty()) {
    return {};
  }
  std::vector<LikenessSource> sources;
  for (const char* name : {"phone_8mp.jpg", "phone_gps.jpg", "compact.jpg", "no_exif.jpg",
                           "landscape_1.jpg", "landscape_6.jpg", "portrait_8.jpg",
                           "phone_12mp.heic", "scan.tiff", "corrupted.jpg", "invalid.jpg"}) {
    const std::string file = name;
    const std::string extension = file.substr(file.rfind('.') + 1);
    sources.push_back(
        {"Camera", file, extension, Copied(media + "/" + file), PhotographVectors(), true});
  }
  return sources;
}

}  // namespace vela_test
