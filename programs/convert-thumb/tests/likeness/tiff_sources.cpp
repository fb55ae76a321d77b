// TIFFs.

#include "likeness/makers.h"
#include "likeness/profiles.h"
#include "likeness/source.h"
#include "likeness/vectors.h"

namespace vela_test {
namespace {

LikenessSource Tiff(const std::string& says, FileMaker make) {
  return {"TIFF", says, "tif", std::move(make), {kSix, kFill, kBare}};
}

void AddLayouts(std::vector<LikenessSource>& sources) {
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

void AddDepths(std::vector<LikenessSource>& sources) {
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

void AddColours(std::vector<LikenessSource>& sources) {
  sources.push_back(Tiff("alpha", WrittenWithAlpha({"-depth", "8"})));
  sources.push_back(Tiff("CMYK", Written({"-colorspace", "CMYK", "-depth", "8"})));
  sources.push_back(Tiff("CMYK, ink profile",
                         WrittenWithProfile({"-colorspace", "CMYK", "-depth", "8"}, InkProfile)));
  sources.push_back(Tiff("wide RGB profile", WrittenWithProfile({"-depth", "8"}, WideRgbProfile)));
  sources.push_back(Tiff("Lab", Written({"-colorspace", "Lab", "-depth", "8"})));
}

LikenessSource Pages(const std::string& says, bool firstPage) {
  LikenessSource source =
      Tiff(says, Written({"-depth", "8", "(", "+clone", "-negate", "-resize", "50%", ")"}));
  source.firstPage = firstPage;
  source.vectors = {kSix, kSingle};
  return source;
}

}  // namespace

std::vector<LikenessSource> TiffSources() {
  std::vector<LikenessSource> sources;
  AddLayouts(sources);
  AddDepths(sources);
  AddColours(sources);
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

}  // namespace vela_test
