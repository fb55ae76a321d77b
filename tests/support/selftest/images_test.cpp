// The image makers and the checks, each compared with an independent tool.
#include "support/images.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/files.h"
#include "support/image_checks.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"

namespace vela_test {
namespace {

using ::testing::HasSubstr;

class ImagesTest : public SandboxTest {};

std::string Exiftool(const std::vector<std::string>& options, const std::string& path) {
  std::vector<std::string> arguments = options;
  arguments.push_back(path);
  return RunProgram("/usr/bin/exiftool", arguments).out;
}

void Convert(const std::vector<std::string>& arguments) {
  const ProgramResult result = RunProgram("/usr/bin/convert", arguments);
  EXPECT_EQ(result.exitCode, 0) << result.err;
}

TEST_F(ImagesTest, JpegHasItsSizeAndQuadrants) {
  JpegRecipe recipe;
  recipe.width = 101;
  recipe.height = 67;
  MakeJpeg("/tmp/a.jpg", recipe);
  const auto image = DecodeJpeg("/tmp/a.jpg");
  ASSERT_TRUE(image.has_value());
  EXPECT_EQ(image->Width(), 101);
  EXPECT_EQ(image->Height(), 67);
  EXPECT_EQ(image->Components(), 3);
  EXPECT_EQ(QuadrantLetters("/tmp/a.jpg"), "RGBY");
  const ImageIdentity identity = Identify("/tmp/a.jpg");
  EXPECT_EQ(identity.format, "JPEG");
  EXPECT_EQ(identity.width, 101);
  EXPECT_EQ(identity.height, 67);
  EXPECT_EQ(identity.frames, 1);
}

TEST_F(ImagesTest, PlainJpegCarriesNothing) {
  MakeJpeg("/tmp/a.jpg");
  const JpegMetadata metadata = ReadJpegMetadata("/tmp/a.jpg");
  EXPECT_FALSE(metadata.exif || metadata.xmp || metadata.iptc || metadata.icc || metadata.comment);
  EXPECT_EQ(metadata.orientation, 0);
}

TEST_F(ImagesTest, MetadataIsWhatOtherToolsRead) {
  JpegRecipe recipe;
  recipe.exif = recipe.xmp = recipe.iptc = recipe.iccProfile = true;
  recipe.comment = "remark";
  MakeJpeg("/tmp/a.jpg", recipe);
  const JpegMetadata metadata = ReadJpegMetadata("/tmp/a.jpg");
  EXPECT_TRUE(metadata.exif && metadata.xmp && metadata.iptc && metadata.icc && metadata.comment);
  EXPECT_EQ(Exiftool({"-S", "-Make", "-Title", "-Caption-Abstract", "-Comment"}, "/tmp/a.jpg"),
            "Make: Maker\nTitle: Title\nCaption-Abstract: Caption\nComment: remark\n");
  EXPECT_THAT(Exiftool({"-S", "-ICC_Profile:ProfileDescription"}, "/tmp/a.jpg"), HasSubstr("sRGB"));
}

TEST_F(ImagesTest, MetadataBlocksAreDistinguished) {
  JpegRecipe iptc;
  iptc.iptc = true;
  JpegMetadata metadata = ReadJpegMetadata(MakeJpeg("/tmp/a.jpg", iptc));
  EXPECT_TRUE(metadata.iptc);
  EXPECT_FALSE(metadata.exif || metadata.xmp || metadata.icc || metadata.comment);
  JpegRecipe icc;
  icc.iccProfile = true;
  metadata = ReadJpegMetadata(MakeJpeg("/tmp/a.jpg", icc));
  EXPECT_TRUE(metadata.icc);
  EXPECT_FALSE(metadata.exif || metadata.xmp || metadata.iptc || metadata.comment);
}

TEST_F(ImagesTest, OrientationsReadAsImageMagickTurnsThem) {
  for (int orientation = 1; orientation <= 8; ++orientation) {
    JpegRecipe recipe;
    recipe.orientation = orientation;
    MakeJpeg("/tmp/a.jpg", recipe);
    EXPECT_EQ(ReadJpegMetadata("/tmp/a.jpg").orientation, orientation);
    EXPECT_EQ(QuadrantLetters("/tmp/a.jpg"), "RGBY");
    Convert({"/tmp/a.jpg", "-auto-orient", "/tmp/turned.jpg"});
    EXPECT_EQ(QuadrantLetters("/tmp/turned.jpg"), LettersAfterOrientation(orientation))
        << orientation;
  }
}

TEST_F(ImagesTest, TurnsReadAsImageMagickTurns) {
  MakeJpeg("/tmp/a.jpg");
  for (const int degrees : {0, 90, 180, 270}) {
    Convert({"/tmp/a.jpg", "-rotate", std::to_string(degrees), "/tmp/turned.jpg"});
    EXPECT_EQ(QuadrantLetters("/tmp/turned.jpg"), LettersAfterTurn(degrees)) << degrees;
  }
}

TEST_F(ImagesTest, OrientationInBigEndianExifIsRead) {
  JpegRecipe recipe;
  recipe.orientation = 5;
  MakeJpeg("/tmp/a.jpg", recipe);
  ASSERT_EQ(RunProgram("/usr/bin/exiftool",
                       {"-all=", "-ExifByteOrder=MM", "-n", "-Orientation=7", "/tmp/a.jpg"})
                .exitCode,
            0);
  EXPECT_EQ(ReadJpegMetadata("/tmp/a.jpg").orientation, 7);
}

TEST_F(ImagesTest, GreyAndCmykJpegs) {
  JpegRecipe recipe;
  recipe.colour = JpegColour::kGrey;
  MakeJpeg("/tmp/grey.jpg", recipe);
  EXPECT_EQ(DecodeJpeg("/tmp/grey.jpg")->Components(), 1);
  recipe.colour = JpegColour::kCmyk;
  MakeJpeg("/tmp/cmyk.jpg", recipe);
  EXPECT_EQ(DecodeJpeg("/tmp/cmyk.jpg")->Components(), 4);
  EXPECT_EQ(QuadrantLetters("/tmp/cmyk.jpg"), "RGBY");
  // Another reader sees the same inks.
  Convert({"/tmp/cmyk.jpg", "-colorspace", "sRGB", "/tmp/rgb.jpg"});
  EXPECT_EQ(DecodeJpeg("/tmp/rgb.jpg")->Components(), 3);
  EXPECT_EQ(QuadrantLetters("/tmp/rgb.jpg"), "RGBY");
}

TEST_F(ImagesTest, DamagedJpegsAreNotWhole) {
  std::string why;
  MakeTruncatedJpeg("/tmp/cut.jpg");
  EXPECT_FALSE(DecodeJpeg("/tmp/cut.jpg", &why).has_value());
  EXPECT_NE(why, "");
  EXPECT_EQ(QuadrantLetters("/tmp/cut.jpg"), "");
  MakeJpeg("/tmp/a.jpg");
  EXPECT_TRUE(IsWholeJpeg("/tmp/a.jpg"));
  AppendToFile("/tmp/a.jpg", "x");
  EXPECT_FALSE(DecodeJpeg("/tmp/a.jpg", &why).has_value());
  EXPECT_EQ(why, "1 bytes behind the end");
  WriteFile("/tmp/none.jpg", "no picture");
  WriteFile("/tmp/empty.jpg", "");
  for (const char* path : {"/tmp/none.jpg", "/tmp/empty.jpg", "/tmp/missing.jpg"}) {
    EXPECT_FALSE(IsWholeJpeg(path)) << path;
  }
}

TEST_F(ImagesTest, TransparentPng) {
  MakeTransparentPng("/tmp/a.png", 80, 60);
  EXPECT_EQ(Identify("/tmp/a.png").format, "PNG");
  Convert({"/tmp/a.png", "-background", "white", "-flatten", "/tmp/white.jpg"});
  EXPECT_EQ(QuadrantLetters("/tmp/white.jpg"), "RWBW");
  Convert({"/tmp/a.png", "-background", "black", "-flatten", "/tmp/black.jpg"});
  EXPECT_EQ(QuadrantLetters("/tmp/black.jpg"), "RKBK");
}

TEST_F(ImagesTest, PicturesOfSeveralFrames) {
  MakeAnimatedGif("/tmp/a.gif", 3, 60, 40);
  const ImageIdentity gif = Identify("/tmp/a.gif");
  EXPECT_EQ(gif.format, "GIF");
  EXPECT_EQ(gif.frames, 3);
  EXPECT_EQ(gif.width, 60);
  MakeMultiPageTiff("/tmp/a.tif", 2);
  EXPECT_EQ(Identify("/tmp/a.tif").format, "TIFF");
  EXPECT_EQ(Identify("/tmp/a.tif").frames, 2);
  Convert({"/tmp/a.gif[0]", "/tmp/first.jpg"});
  EXPECT_EQ(QuadrantLetters("/tmp/first.jpg"), "RGBY");
  Convert({"/tmp/a.tif[1]", "/tmp/second.jpg"});
  EXPECT_EQ(QuadrantLetters("/tmp/second.jpg"), "EEEE");
}

TEST_F(ImagesTest, OtherFormatsByExtension) {
  for (const std::string format : {"png", "bmp", "webp", "psd"}) {
    const std::string path = MakeImage("/tmp/a." + format, 60, 40);
    EXPECT_EQ(Identify(path).width, 60) << format;
    EXPECT_EQ(Identify(path).height, 40) << format;
  }
  EXPECT_EQ(Identify(MakePpm("/tmp/a.ppm")).format, "PPM");
}

TEST_F(ImagesTest, OtherFilesHaveNoIdentity) {
  WriteFile("/tmp/a.jpg", "no picture");
  EXPECT_EQ(Identify("/tmp/a.jpg").format, "");
}

}  // namespace
}  // namespace vela_test
