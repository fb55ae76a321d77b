// Files that end too early or have wrong bytes in them.

#include "likeness/makers.h"
#include "likeness/source.h"
#include "likeness/vectors.h"

namespace vela_test {
namespace {

void AddDamages(std::vector<LikenessSource>& sources, const std::string& what,
                const std::string& extension, const FileMaker& make) {
  const std::vector<std::string> vectors = {kSix, kSingle};
  sources.push_back({"Damaged", what + " that ends early", extension, Truncated(make), vectors});
  sources.push_back(
      {"Damaged", what + " of which little is left", extension, Truncated(make, 1), {kSingle}});
  sources.push_back({"Damaged", what + " with wrong bytes", extension, Damaged(make), vectors});
}

}  // namespace

std::vector<LikenessSource> DamagedSources() {
  std::vector<LikenessSource> sources;
  JpegKind progressive;
  progressive.progressive = true;
  AddDamages(sources, "JPEG", "jpg", Encoded({}));
  AddDamages(sources, "progressive JPEG", "jpg", Encoded(progressive));
  AddDamages(sources, "PNG", "png", Written({"-depth", "8"}));
  AddDamages(sources, "interlaced PNG", "png", Written({"-depth", "8", "-interlace", "Plane"}));
  AddDamages(sources, "TIFF", "tif", Written({"-depth", "8", "-compress", "None"}));
  AddDamages(sources, "LZW TIFF", "tif", Written({"-depth", "8", "-compress", "LZW"}));
  AddDamages(sources, "GIF", "gif", Written({}));
  AddDamages(sources, "WebP", "webp", Written({}));
  AddDamages(sources, "lossless WebP", "webp", Written({"-define", "webp:lossless=true"}));
  AddDamages(sources, "PPM", "ppm", Written({"-depth", "8"}));
  AddDamages(sources, "HEIC", "heic", Written({}));
  AddDamages(sources, "BMP", "bmp", Written({"-depth", "8"}));
  AddDamages(sources, "PSD", "psd", Written({"-depth", "8"}));
  constexpr size_t kEndChunk = 12;
  sources.push_back(
      {"Damaged",
       "PNG without its end chunk",
       "png",
       WithoutEnd(Written({"-depth", "8", "-define", "png:exclude-chunk=all"}), kEndChunk),
       {kSix, kSingle}});
  return sources;
}

}  // namespace vela_test
