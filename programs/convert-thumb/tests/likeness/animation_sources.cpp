// Formats that hold animations too: GIF and WebP.

#include "likeness/makers.h"
#include "likeness/profiles.h"
#include "likeness/source.h"
#include "likeness/vectors.h"

namespace vela_test {
namespace {

LikenessSource Gif(const std::string& says, FileMaker make) {
  return {"GIF", says, "gif", std::move(make), {kSix, kFill, kBare}};
}

LikenessSource WebP(const std::string& says, FileMaker make) {
  return {"WebP", says, "webp", std::move(make), {kSix, kFill, kTurned, kBare}};
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

}  // namespace

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

}  // namespace vela_test
