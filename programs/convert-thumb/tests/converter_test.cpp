// The converter's pictures compared with ImageMagick's.

#include <sys/resource.h>
#include <sys/stat.h>

#include <algorithm>
#include <csignal>

#include "converter_fixture.h"
#include "support/build_paths.h"

namespace vela_test {
namespace {

using namespace ::testing;

class Converter : public ConverterTest {
 protected:
  std::string MakeOrientedPhoto(int orientation) const {
    JpegRecipe recipe;
    recipe.width = 500;
    recipe.height = 300;
    recipe.orientation = orientation;
    return MakeJpeg(directory_ + "/a.jpg", recipe);
  }
};

TEST_F(Converter, MakesImageMagicksPicturesOfASmallPhoto) {
  // Decoded at its full size: only rounding differs.
  ExpectSamePictures(MakePhoto("a.jpg", 1400, 1050), UsualOutputs(), 48, 45);
}

TEST_F(Converter, MakesImageMagicksPicturesOfPhotosOfEverySize) {
  ExpectSamePictures(MakePhoto("large.jpg", 4000, 3000), UsualOutputs());
  ExpectSamePictures(MakePhoto("very_large.jpg", 8000, 6000), UsualOutputs());
  ExpectSamePictures(MakePhoto("portrait.jpg", 1500, 2500), UsualOutputs());
}

TEST_F(Converter, KeepsTheChromaSampling) {
  for (const char* sampling : {"1x1", "2x1", "2x2", "1x2"}) {
    ExpectSamePictures(MakePhoto("a.jpg", 2000, 1500, {"-sampling-factor", std::string(sampling)}),
                       UsualOutputs());
  }
}

TEST_F(Converter, DecodesProgressivePhotos) {
  ExpectSamePictures(MakePhoto("a.jpg", 2000, 1500, {"-interlace", "Plane"}), UsualOutputs());
}

TEST_F(Converter, MakesGreyThumbnailsOfGreyPhotos) {
  ExpectSamePictures(MakePhoto("a.jpg", 2000, 1500, {"-colorspace", "Gray"}), UsualOutputs());
  EXPECT_EQ(DecodeJpeg(directory_ + "/ours0.jpg")->Components(), 1);
}

TEST_F(Converter, MakesGreyThumbnailsOfColourPhotosWithoutColour) {
  const std::string photo =
      MakePhoto("a.jpg", 900, 700, {"-colorspace", "Gray", "-type", "TrueColor"});
  ASSERT_EQ(DecodeJpeg(photo)->Components(), 3);
  ExpectSamePictures(photo, UsualOutputs());
  EXPECT_EQ(DecodeJpeg(directory_ + "/ours0.jpg")->Components(), 1);
}

TEST_F(Converter, FillsTheBox) {
  const auto outputs = UsualOutputs([](ThumbOptions& options) { options.fill = true; });
  ExpectSamePictures(MakePhoto("a.jpg", 3000, 2000), outputs);
}

TEST_F(Converter, NeedsNoSharpening) {
  const auto outputs = UsualOutputs([](ThumbOptions& options) { options.unsharp.clear(); });
  ExpectSamePictures(MakePhoto("a.jpg", 3000, 2000), outputs);
}

TEST_F(Converter, SharpensWithAnyKernel) {
  for (const char* mask : {"0x2+1+0", "1x1+0.5+0.05", "3x1.5+1.2+0.02", "0.5x0.5", "2"}) {
    ThumbOptions options = Square(400);
    options.unsharp = mask;
    ExpectSamePictures(MakePhoto("a.jpg", 900, 700), {options}, 45, 45);
  }
}

TEST_F(Converter, StoresWithAnyQuality) {
  for (const int quality : {1, 50, 80, 90, 91, 95, 100}) {
    ThumbOptions options;
    options.quality = quality;
    ExpectSamePictures(MakePhoto("a.jpg", 900, 700), {options}, 40, 40);
  }
}

TEST_F(Converter, RotatesEveryOutput) {
  for (const int degrees : {90, 180, 270, 360}) {
    const auto outputs = UsualOutputs([&](ThumbOptions& options) { options.rotate = degrees; });
    ExpectSamePictures(MakePhoto("a.jpg", 1400, 900), outputs);
  }
}

TEST_F(Converter, AppliesEveryOrientationOnce) {
  for (int orientation = 0; orientation <= 8; ++orientation) {
    ExpectSamePictures(MakeOrientedPhoto(orientation), UsualOutputs());
    for (const char* name : {"/ours0.jpg", "/ours3.jpg"}) {
      EXPECT_EQ(QuadrantLetters(directory_ + name), LettersAfterOrientation(orientation));
    }
  }
}

TEST_F(Converter, IgnoresTheOrientationUnlessRequested) {
  std::vector<ThumbOptions> outputs = UsualOutputs();
  outputs.front().autoOrient = false;
  ExpectSamePictures(MakeOrientedPhoto(6), outputs);
  EXPECT_EQ(QuadrantLetters(directory_ + "/ours0.jpg"), "RGBY");
  EXPECT_EQ(QuadrantLetters(directory_ + "/ours1.jpg"), LettersAfterOrientation(6));
}

TEST_F(Converter, KeepsTheColourProfileAndNothingElse) {
  JpegRecipe recipe;
  recipe.width = 500;
  recipe.height = 300;
  recipe.exif = true;
  recipe.xmp = true;
  recipe.iptc = true;
  recipe.iccProfile = true;
  recipe.comment = "a comment";
  for (const bool strip : {false, true}) {
    ThumbOptions options;
    options.stripProfiles = strip;
    ExpectSamePictures(MakeJpeg(directory_ + "/a.jpg", recipe), {options, options});
    const JpegMetadata kept = ReadJpegMetadata(directory_ + "/ours1.jpg");
    EXPECT_TRUE(kept.icc);
    EXPECT_FALSE(kept.exif || kept.xmp || kept.iptc);
    EXPECT_FALSE(kept.comment);
  }
}

TEST_F(Converter, DropsAGreyPhotosProfileWhenItsColourChanges) {
  JpegRecipe recipe;
  recipe.colour = JpegColour::kGrey;
  recipe.iccProfile = true;
  const std::string photo = MakeJpeg(directory_ + "/a.jpg", recipe);
  for (const bool convert : {false, true}) {
    ThumbOptions options;
    options.convertToSrgb = convert;
    ExpectSamePictures(photo, {options});
    EXPECT_EQ(ReadJpegMetadata(directory_ + "/ours0.jpg").icc, !convert);
  }
}

TEST_F(Converter, NeverEnlarges) {
  for (const bool fill : {false, true}) {
    const auto outputs = UsualOutputs([&](ThumbOptions& options) { options.fill = fill; });
    ExpectSamePictures(MakePhoto("a.jpg", 1, 1), outputs);
    ExpectSamePictures(MakePhoto("b.jpg", 7, 3), outputs);
    ExpectSamePictures(MakePhoto("c.jpg", 100, 2000), outputs);
    ExpectSamePictures(MakePhoto("d.jpg", 2000, 50), outputs);
  }
}

TEST_F(Converter, MakesThumbnailsOfEverySize) {
  const std::string photo = MakePhoto("a.jpg", 1203, 907);
  for (const int width : {1, 2, 25, 26, 127, 380, 381, 1202, 1203}) {
    ThumbOptions options;
    options.width = width;
    options.height = 1000;
    ExpectSamePictures(photo, {options});
  }
}

TEST_F(Converter, MakesThumbnailsOfPanoramasThatImageMagickRefuses) {
  JpegRecipe recipe;
  recipe.width = 30000;
  recipe.height = 10;
  ExpectSuccess(Convert(MakeJpeg(directory_ + "/a.jpg", recipe), UsualOutputs()));
  const ImageIdentity thumbnail = Identify(directory_ + "/ours0.jpg");
  EXPECT_EQ(thumbnail.width, 1280);
  EXPECT_EQ(thumbnail.height, 1);
}

TEST_F(Converter, ReadsPhotosOfAnyName) {
  const std::string photo = MakePhoto("plain.jpg", 300, 200);
  for (const char* name :
       {"a[1].jpg", "a*b?.jpg", "{a,b}.jpg", "a:b.jpg", "@a.jpg", "100%.jpg", "%d.jpg", " a .jpg",
        "-a.jpg", "\xff\xfe.jpg", "a\nb.jpg", "png:a.jpg"}) {
    const std::string source = directory_ + "/" + name;
    CopyFile(photo, source);
    for (const char* page : {"", "[0]"}) {
      const ProgramResult result =
          RunConverter(Line(source + page, {ThumbOptions()}, "odd").Arguments());
      EXPECT_EQ(result.exitCode, 0) << name << result.err;
      EXPECT_TRUE(IsWholeJpeg(directory_ + "/odd0.jpg")) << name;
      RemoveTree(directory_ + "/odd0.jpg");
    }
  }
}

TEST_F(Converter, WritesToAnyName) {
  const std::string photo = MakePhoto("a.jpg", 300, 200);
  const CommandLine line{photo, "", {{{}, directory_ + "/100%%[0]*.jpg"}}};
  EXPECT_EQ(RunConverter(line.Arguments()).exitCode, 0);
  EXPECT_TRUE(IsWholeJpeg(directory_ + "/100%[0]*.jpg"));
}

TEST_F(Converter, GivesDamagedPhotosImageMagicksVerdict) {
  const std::string photo = MakePhoto("a.jpg", 700, 500);
  const std::string bytes = ReadFile(photo);
  for (size_t i = 0; i <= 20; ++i) {
    const std::string cut = directory_ + "/cut" + std::to_string(i) + ".jpg";
    WriteFile(cut, bytes.substr(0, bytes.size() * i / 20));
    ExpectSameVerdict(cut, UsualOutputs());
  }
}

TEST_F(Converter, GivesPhotosWithWrongBytesImageMagicksVerdict) {
  const std::string photo = MakePhoto("a.jpg", 400, 300);
  const std::string bytes = ReadFile(photo);
  for (size_t place = 2; place < bytes.size(); place += bytes.size() / 40) {
    std::string wrong = bytes;
    for (size_t i = place; i < std::min(place + 4, wrong.size()); ++i) {
      wrong[i] = static_cast<char>(wrong[i] ^ 0x5A);
    }
    WriteFile(directory_ + "/wrong.jpg", wrong);
    ExpectSameVerdict(directory_ + "/wrong.jpg", {ThumbOptions()});
  }
}

TEST_F(Converter, FailsWithoutAPhoto) {
  ExpectSameVerdict(directory_ + "/none.jpg", UsualOutputs());
  WriteFile(directory_ + "/empty.jpg", "");
  ExpectSameVerdict(directory_ + "/empty.jpg", UsualOutputs());
  ExpectSameVerdict(directory_, UsualOutputs());
}

TEST_F(Converter, FailsWhenAnOutputCannotBeWritten) {
  const std::string photo = MakePhoto("a.jpg", 700, 500);
  CommandLine line = Line(photo, UsualOutputs(), "ours");
  line.outputs[2].path = directory_ + "/missing/a.jpg";
  EXPECT_EQ(RunConverter(line.Arguments()).exitCode, 1);
}

TEST_F(Converter, LeavesNoPartOfAnOutput) {
  const std::string photo = MakePhoto("a.jpg", 700, 500);
  ProgramOptions options;
  options.beforeExec = {IgnoreSignal(SIGXFSZ), LimitResource(RLIMIT_FSIZE, 4096)};
  EXPECT_EQ(Convert(photo, {UsualOutputs().front()}, options).exitCode, 1);
  EXPECT_FALSE(Exists(directory_ + "/ours0.jpg"));
}

TEST_F(Converter, LeavesPermissionsToTheUmask) {
  const std::string photo = MakePhoto("a.jpg", 300, 200);
  for (const mode_t mask : {mode_t{0}, mode_t{022}, mode_t{077}}) {
    ProgramOptions options;
    options.umask = mask;
    const std::string prefix = "mask" + std::to_string(mask);
    RunConverter(Line(photo, {ThumbOptions()}, prefix).Arguments(), options);
    EXPECT_EQ(ModeOf(directory_ + "/" + prefix + "0.jpg"), static_cast<int>(0666 & ~mask));
  }
}

TEST_F(Converter, KeepsToItsMemoryLimit) {
  const std::string photo = MakePhoto("a.jpg", 2000, 1500, {"-interlace", "Plane"});
  SetMemoryLimit("1000000");
  EXPECT_EQ(Convert(photo, UsualOutputs()).exitCode, 1);
  SetMemoryLimit("64000000");
  EXPECT_EQ(Convert(photo, UsualOutputs()).exitCode, 0);
}

TEST_F(Converter, RefusesThumbnailsThatTakeTooMuchMemory) {
  const std::string photo = MakePhoto("a.jpg", 2000, 1500);
  const std::vector<ThumbOptions> outputs = {Square(2000)};
  SetMemoryLimit("50000000");
  const ProgramResult result = Convert(photo, outputs);
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("too much memory"));
  SetMemoryLimit("60000000");
  EXPECT_EQ(Convert(photo, outputs).exitCode, 0);
}

// A sanitizer uses many times the limit for itself.
#ifndef __SANITIZE_ADDRESS__
TEST_F(Converter, NeedsLittleMemoryForALargePhoto) {
  const std::string photo = MakePhoto("a.jpg", 8000, 6000);
  ProgramOptions options;
  // Includes the libraries and two stacks.
  options.beforeExec = {LimitResource(RLIMIT_DATA, 56U << 20)};
  ExpectSuccess(Convert(photo, UsualOutputs(), options));
}
#endif

TEST_F(Converter, MakesImageMagicksPicturesOfCameraFiles) {
  const std::string media = SharedMediaDirectory();
  if (media.empty()) {
    return;
  }
  for (const char* name : {"phone_8mp.jpg", "phone_gps.jpg", "compact.jpg", "no_exif.jpg",
                           "landscape_6.jpg", "portrait_8.jpg", "corrupted.jpg"}) {
    ExpectSamePictures(media + "/" + name, UsualOutputs());
  }
}

}  // namespace
}  // namespace vela_test
