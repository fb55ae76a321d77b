// PNGs.

#include "likeness/makers.h"
#include "likeness/profiles.h"
#include "likeness/source.h"
#include "likeness/vectors.h"

namespace vela_test {
namespace {

LikenessSource Png(const std::string& says, FileMaker make) {
  return {"PNG", says, "png", std::move(make), {kSix, kFill, kTurned, kBare}};
}

LikenessSource Large(LikenessSource source) {
  source.isLarge = true;
  source.vectors = {kSix, kSingle};
  return source;
}

void AddDepths(std::vector<LikenessSource>& sources) {
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

void AddAlpha(std::vector<LikenessSource>& sources) {
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

void AddChunks(std::vector<LikenessSource>& sources) {
  sources.push_back(Png("interlaced", Written({"-depth", "8", "-interlace", "Plane"})));
  sources.push_back(Png("wide RGB profile", WrittenWithProfile({"-depth", "8"}, WideRgbProfile)));
  sources.push_back(
      Png("gamma 0.6", Written({"-depth", "8", "-define", "png:exclude-chunk=sRGB,cHRM", "-gamma",
                                "1", "-set", "gamma", "0.6"})));
  sources.push_back(Png("gamma and primaries",
                        Written({"-depth", "8", "-define", "png:include-chunk=gAMA,cHRM"})));
  sources.push_back(
      Png("no chunk but the data", Written({"-depth", "8", "-define", "png:exclude-chunk=all"})));
  sources.push_back(Png("300 dots per inch",
                        Written({"-depth", "8", "-units", "PixelsPerInch", "-density", "300"})));
  sources.push_back(Png("orientation 6", WithOrientation(6)));
}

/// The data counts, not the name.
LikenessSource Misnamed() {
  LikenessSource source = Png("under the name of a JPEG", [](const std::string& path) {
    Written({"-depth", "8"})(path + ".png");
    Copied(path + ".png")(path);
  });
  source.extension = "jpg";
  return source;
}

}  // namespace

std::vector<LikenessSource> PngSources() {
  std::vector<LikenessSource> sources;
  AddDepths(sources);
  AddAlpha(sources);
  AddChunks(sources);
  sources.push_back(Large(Png("3 megapixels", Written({"-depth", "8"}, {2048, 1536}))));
  sources.push_back(
      Large(Png("alpha, 2 megapixels", WrittenWithAlpha({"-depth", "8"}, {1632, 1224}))));
  sources.push_back(Misnamed());
  sources.push_back(Png("1 x 1", Written({"-depth", "8"}, {1, 1})));
  sources.push_back(Png("10 x 2000", Written({"-depth", "8"}, {10, 2000})));
  return sources;
}

}  // namespace vela_test
