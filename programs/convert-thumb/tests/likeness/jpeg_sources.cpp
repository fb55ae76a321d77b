// JPEGs.

#include "likeness/makers.h"
#include "likeness/profiles.h"
#include "likeness/source.h"
#include "likeness/vectors.h"

namespace vela_test {
namespace {

LikenessSource Jpeg(const std::string& says, const JpegKind& kind, PhotoSize size = {}) {
  return {"JPEG", says, "jpg", Encoded(kind, size), UsualVectors()};
}

LikenessSource LargeJpeg(const std::string& says, const JpegKind& kind, PhotoSize size) {
  LikenessSource source = Jpeg(says, kind, size);
  source.isLarge = true;
  return source;
}

/// Tiny and very flat ones: only what is made of them in the end matters.
LikenessSource OddSize(const std::string& says, PhotoSize size) {
  LikenessSource source = LargeJpeg(says, {}, size);
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

void AddSampling(std::vector<LikenessSource>& sources) {
  struct Sampling {
    const char* says;
    int across;
    int down;
  };
  for (const Sampling& sampling :
       {Sampling{"4:4:4", 1, 1}, {"4:2:2", 2, 1}, {"4:4:0", 1, 2}, {"4:1:1", 4, 1}}) {
    JpegKind kind;
    kind.across = sampling.across;
    kind.down = sampling.down;
    sources.push_back(Jpeg(sampling.says, kind));
  }
}

void AddEncodings(std::vector<LikenessSource>& sources) {
  JpegKind kind;
  sources.push_back(Jpeg("4:2:0, no EXIF", kind));
  kind.progressive = true;
  sources.push_back(Jpeg("progressive", kind));
  sources.push_back(LargeJpeg("progressive, 3 megapixels", kind, {2048, 1536}));
  kind = {};
  kind.arithmetic = true;
  sources.push_back(Jpeg("arithmetic coding", kind));
  kind.progressive = true;
  sources.push_back(Jpeg("arithmetic coding, progressive", kind));
  kind = {};
  kind.restartRows = 1;
  sources.push_back(Jpeg("restart markers", kind));
  kind = {};
  kind.dotsPerInch = 300;
  sources.push_back(Jpeg("300 dots per inch", kind));
  for (const int quality : {5, 100}) {
    kind = {};
    kind.quality = quality;
    sources.push_back(Jpeg("quality " + std::to_string(quality), kind));
  }
}

void AddColours(std::vector<LikenessSource>& sources) {
  JpegKind kind;
  LikenessSource dithered = Jpeg("dithered colours", kind);
  dithered.make = Written({"-dither", "FloydSteinberg", "-posterize", "2", "-quality", "92"});
  sources.push_back(dithered);
  kind.profile = WideRgbProfile();
  sources.push_back(Jpeg("wide RGB profile", kind));
  kind.profile = DisplayRgbProfile();
  sources.push_back(Jpeg("display RGB profile", kind));
  kind = {};
  kind.colours = JpegColours::kRgb;
  kind.across = 1;
  kind.down = 1;
  sources.push_back(Jpeg("RGB components", kind));
  kind = {};
  kind.colours = JpegColours::kGrey;
  sources.push_back(Jpeg("grey", kind));
  kind.profile = GreyProfile();
  sources.push_back(Jpeg("grey, grey profile", kind));
}

void AddInks(std::vector<LikenessSource>& sources) {
  JpegKind kind;
  kind.colours = JpegColours::kInks;
  kind.across = 1;
  kind.down = 1;
  sources.push_back(Jpeg("CMYK", kind));
  kind.profile = InkProfile();
  sources.push_back(Jpeg("CMYK, ink profile", kind));
  kind.profile.clear();
  kind.editorMarker = false;
  sources.push_back(Jpeg("CMYK, no marker", kind));
  kind = {};
  kind.colours = JpegColours::kLumaChromaInk;
  sources.push_back(Jpeg("YCCK", kind));
  kind.profile = InkProfile();
  kind.orientation = 6;
  sources.push_back(Jpeg("YCCK, ink profile, orientation 6", kind));
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
