// JPEGs.

#include "likeness/makers.h"
#include "likeness/profiles.h"
#include "likeness/source.h"
#include "likeness/vectors.h"

namespace vela_test {
namespace {

LikenessSource Jpeg(const std::string& description, const JpegKind& kind, PhotoSize size = {}) {
  return {"JPEG", description, "jpg", Encoded(kind, size), UsualVectors()};
}

LikenessSource LargeJpeg(const std::string& description, const JpegKind& kind, PhotoSize size) {
  LikenessSource source = Jpeg(description, kind, size);
  source.isLarge = true;
  return source;
}

/// Tiny and very flat ones: only the final thumbnails matter.
LikenessSource OddSize(const std::string& description, PhotoSize size) {
  LikenessSource source = LargeJpeg(description, {}, size);
  source.vectors = {kSix, kFill, kBare};
  return source;
}

void AddOrientations(std::vector<LikenessSource>& sources) {
  for (int orientation = 0; orientation <= 9; ++orientation) {
    JpegKind kind;
    kind.orientation = orientation;
    LikenessSource source = Jpeg("orientation " + std::to_string(orientation), kind);
    source.vectors = {kSix, kTurned, kBare};
    sources.push_back(source);
  }
}

/// A usual JPEG after `change`.
template <typename Change>
JpegKind Kind(Change change) {
  JpegKind kind;
  change(kind);
  return kind;
}

JpegKind Sampled(int across, int down) {
  return Kind([&](JpegKind& kind) {
    kind.across = across;
    kind.down = down;
  });
}

JpegKind WithProfile(JpegKind kind, const std::string& profile) {
  kind.profile = profile;
  return kind;
}

void AddSampling(std::vector<LikenessSource>& sources) {
  sources.push_back(Jpeg("4:4:4", Sampled(1, 1)));
  sources.push_back(Jpeg("4:2:2", Sampled(2, 1)));
  sources.push_back(Jpeg("4:4:0", Sampled(1, 2)));
  sources.push_back(Jpeg("4:1:1", Sampled(4, 1)));
}

void AddEncodings(std::vector<LikenessSource>& sources) {
  const JpegKind progressive = Kind([](JpegKind& kind) { kind.progressive = true; });
  JpegKind arithmetic = Kind([](JpegKind& kind) { kind.arithmetic = true; });
  sources.push_back(Jpeg("4:2:0, no EXIF", {}));
  sources.push_back(Jpeg("progressive", progressive));
  sources.push_back(LargeJpeg("progressive, 3 megapixels", progressive, {2048, 1536}));
  sources.push_back(Jpeg("arithmetic coding", arithmetic));
  arithmetic.progressive = true;
  sources.push_back(Jpeg("arithmetic coding, progressive", arithmetic));
  sources.push_back(Jpeg("restart markers", Kind([](JpegKind& kind) { kind.restartRows = 1; })));
  sources.push_back(
      Jpeg("300 dots per inch", Kind([](JpegKind& kind) { kind.dotsPerInch = 300; })));
  for (const int quality : {5, 100}) {
    sources.push_back(Jpeg("quality " + std::to_string(quality),
                           Kind([&](JpegKind& kind) { kind.quality = quality; })));
  }
}

void AddColours(std::vector<LikenessSource>& sources) {
  const JpegKind grey = Kind([](JpegKind& kind) { kind.colours = JpegColours::kGrey; });
  JpegKind rgb = Sampled(1, 1);
  rgb.colours = JpegColours::kRgb;
  LikenessSource dithered = Jpeg("dithered colours", {});
  dithered.make = Written({"-dither", "FloydSteinberg", "-posterize", "2", "-quality", "92"});
  sources.push_back(dithered);
  sources.push_back(Jpeg("wide RGB profile", WithProfile({}, WideRgbProfile())));
  sources.push_back(Jpeg("display RGB profile", WithProfile({}, DisplayRgbProfile())));
  sources.push_back(Jpeg("RGB components", rgb));
  sources.push_back(Jpeg("grey", grey));
  sources.push_back(Jpeg("grey, grey profile", WithProfile(grey, GreyProfile())));
}

void AddInks(std::vector<LikenessSource>& sources) {
  JpegKind inks = Sampled(1, 1);
  inks.colours = JpegColours::kCmyk;
  sources.push_back(Jpeg("CMYK", inks));
  sources.push_back(Jpeg("CMYK, ink profile", WithProfile(inks, InkProfile())));
  inks.editorMarker = false;
  sources.push_back(Jpeg("CMYK, no marker", inks));
  JpegKind ycck = Kind([](JpegKind& kind) { kind.colours = JpegColours::kLumaChromaInk; });
  sources.push_back(Jpeg("YCCK", ycck));
  ycck.orientation = 6;
  sources.push_back(Jpeg("YCCK, ink profile, orientation 6", WithProfile(ycck, InkProfile())));
}

void AddSizes(std::vector<LikenessSource>& sources) {
  sources.push_back(LargeJpeg("3 megapixels", {}, {2048, 1536}));
  LikenessSource source = LargeJpeg("8 megapixels", {}, {3264, 2448});
  source.vectors = PhotographVectors();
  sources.push_back(source);
  source = LargeJpeg("12 megapixels", {}, {4000, 3000});
  source.vectors = {kSix, kTurned, kSingle, kMiddle};
  sources.push_back(source);
  source = LargeJpeg("24 megapixels", {}, {6000, 4000});
  source.vectors = {kSix, kSingle, kMiddle};
  sources.push_back(source);
  sources.push_back(Jpeg("641 x 479", {}, {641, 479}));
  sources.push_back(Jpeg("upright, 333 x 777", {}, {333, 777}));
  sources.push_back(OddSize("1 x 1", {1, 1}));
  sources.push_back(OddSize("7 x 3", {7, 3}));
  sources.push_back(OddSize("2000 x 50", {2000, 50}));
  sources.push_back(OddSize("100 x 2000", {100, 2000}));
  sources.push_back(OddSize("30000 x 10", {30000, 10}));
  sources.push_back(OddSize("10 x 30000", {10, 30000}));
}

}  // namespace

std::vector<LikenessSource> JpegSources() {
  std::vector<LikenessSource> sources;
  AddEncodings(sources);
  AddOrientations(sources);
  AddSampling(sources);
  AddColours(sources);
  AddInks(sources);
  AddSizes(sources);
  return sources;
}

}  // namespace vela_test
