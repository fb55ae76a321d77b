// The image makers and the checks, each held against an independent tool.
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
  EXPECT_EQ(0, result.exitCode) << result.err;
}

TEST_F(ImagesTest, JpegHasItsSizeAndQuadrants) {
  JpegRecipe recipe;
  recipe.width = 101;
  recipe.height = 67;
  MakeJpeg("/tmp/a.jpg", recipe);
  const auto image = DecodeJpeg("/tmp/a.jpg");
  ASSERT_TRUE(image.has_value());
  EXPECT_EQ(101, image->Width());
  EXPECT_EQ(67, image->Height());
  EXPECT_EQ(3, image->Components());
  EXPECT_EQ("RGBY", QuadrantLetters("/tmp/a.jpg"));
  const ImageIdentity identity = Identify("/tmp/a.jpg");
  EXPECT_EQ("JPEG", identity.format);
  EXPECT_EQ(101, identity.width);
  EXPECT_EQ(67, identity.height);
  EXPECT_EQ(1, identity.frames);
}

TEST_F(ImagesTest, PlainJpegCarriesNothing) {
  MakeJpeg("/tmp/a.jpg");
  const JpegMetadata metadata = ReadJpegMetadata("/tmp/a.jpg");
  EXPECT_FALSE(metadata.exif || metadata.xmp || metadata.iptc || metadata.icc || metadata.comment);
  EXPECT_EQ(0, metadata.orientation);
}

TEST_F(ImagesTest, MetadataIsWhatOtherToolsRead) {
  JpegRecipe recipe;
  recipe.exif = true;
  recipe.xmp = true;
  recipe.iptc = true;
  recipe.iccProfile = true;
  recipe.comment = "remark";
  MakeJpeg("/tmp/a.jpg", recipe);
  const JpegMetadata metadata = ReadJpegMetadata("/tmp/a.jpg");
  EXPECT_TRUE(metadata.exif && metadata.xmp && metadata.iptc && metadata.icc && metadata.comment);
  EXPECT_EQ("Make: Maker\nTitle: Title\nCaption-Abstract: Caption\nComment: remark\n",
            Exiftool({"-S", "-Make", "-Title", "-Caption-Abstract", "-Comment"}, "/tmp/a.jpg"));
  EXPECT_THAT(Exiftool({"-S", "-ICC_Profile:ProfileDescription"}, "/tmp/a.jpg"), HasSubstr("sRGB"));
}

TEST_F(ImagesTest, EachMetadataBlockIsToldApart) {
  JpegRecipe recipe;
  recipe.iptc = true;
  JpegMetadata metadata = ReadJpegMetadata(MakeJpeg("/tmp/a.jpg", recipe));
  EXPECT_TRUE(metadata.iptc);
  EXPECT_FALSE(metadata.exif || metadata.xmp || metadata.icc || metadata.comment);
  recipe = JpegRecipe();
  recipe.iccProfile = true;
  metadata = ReadJpegMetadata(MakeJpeg("/tmp/a.jpg", recipe));
  EXPECT_TRUE(metadata.icc);
  EXPECT_FALSE(metadata.exif || metadata.xmp || metadata.iptc || metadata.comment);
}

TEST_F(ImagesTest, OrientationsReadAsImageMagickTurnsThem) {
  for (int orientation = 1; orientation <= 8; ++orientation) {
    JpegRecipe recipe;
    recipe.orientation = orientation;
    MakeJpeg("/tmp/a.jpg", recipe);
    EXPECT_EQ(orientation, ReadJpegMetadata("/tmp/a.jpg").orientation);
    EXPECT_EQ("RGBY", QuadrantLetters("/tmp/a.jpg"));
    Convert({"/tmp/a.jpg", "-auto-orient", "/tmp/turned.jpg"});
    EXPECT_EQ(LettersAfterOrientation(orientation), QuadrantLetters("/tmp/turned.jpg"))
        << orientation;
  }
}

TEST_F(ImagesTest, TurnsReadAsImageMagickTurns) {
  MakeJpeg("/tmp/a.jpg");
  for (const int degrees : {0, 90, 180, 270}) {
    Convert({"/tmp/a.jpg", "-rotate", std::to_string(degrees), "/tmp/turned.jpg"});
    EXPECT_EQ(LettersAfterTurn(degrees), QuadrantLetters("/tmp/turned.jpg")) << degrees;
  }
}

TEST_F(ImagesTest, OrientationInBigEndianExifIsRead) {
  JpegRecipe recipe;
  recipe.orientation = 5;
  MakeJpeg("/tmp/a.jpg", recipe);
  ASSERT_EQ(0, RunProgram("/usr/bin/exiftool",
                          {"-all=", "-ExifByteOrder=MM", "-n", "-Orientation=7", "/tmp/a.jpg"})
                   .exitCode);
  EXPECT_EQ(7, ReadJpegMetadata("/tmp/a.jpg").orientation);
}

TEST_F(ImagesTest, GreyAndCmykJpegs) {
  JpegRecipe recipe;
  recipe.colour = JpegColour::kGrey;
  MakeJpeg("/tmp/grey.jpg", recipe);
  EXPECT_EQ(1, DecodeJpeg("/tmp/grey.jpg")->Components());
  recipe.colour = JpegColour::kCmyk;
  MakeJpeg("/tmp/cmyk.jpg", recipe);
  EXPECT_EQ(4, DecodeJpeg("/tmp/cmyk.jpg")->Components());
  EXPECT_EQ("RGBY", QuadrantLetters("/tmp/cmyk.jpg"));
  // Another reader sees the same inks.
  Convert({"/tmp/cmyk.jpg", "-colorspace", "sRGB", "/tmp/rgb.jpg"});
  EXPECT_EQ(3, DecodeJpeg("/tmp/rgb.jpg")->Components());
  EXPECT_EQ("RGBY", QuadrantLetters("/tmp/rgb.jpg"));
}

TEST_F(ImagesTest, WholeJpegsAreToldFromDamagedOnes) {
  std::string why;
  MakeTruncatedJpeg("/tmp/cut.jpg");
  EXPECT_FALSE(DecodeJpeg("/tmp/cut.jpg", &why).has_value());
  EXPECT_NE("", why);
  EXPECT_EQ("", QuadrantLetters("/tmp/cut.jpg"));
  MakeJpeg("/tmp/a.jpg");
  EXPECT_TRUE(IsWholeJpeg("/tmp/a.jpg"));
  AppendToFile("/tmp/a.jpg", "x");
  EXPECT_FALSE(DecodeJpeg("/tmp/a.jpg", &why).has_value());
  EXPECT_EQ("1 bytes behind the end", why);
  WriteFile("/tmp/none.jpg", "no picture");
  EXPECT_FALSE(IsWholeJpeg("/tmp/none.jpg"));
  WriteFile("/tmp/empty.jpg", "");
  EXPECT_FALSE(IsWholeJpeg("/tmp/empty.jpg"));
  EXPECT_FALSE(IsWholeJpeg("/tmp/missing.jpg"));
}

TEST_F(ImagesTest, TransparentPng) {
  MakeTransparentPng("/tmp/a.png", 80, 60);
  EXPECT_EQ("PNG", Identify("/tmp/a.png").format);
  Convert({"/tmp/a.png", "-background", "white", "-flatten", "/tmp/white.jpg"});
  EXPECT_EQ("RWBW", QuadrantLetters("/tmp/white.jpg"));
  Convert({"/tmp/a.png", "-background", "black", "-flatten", "/tmp/black.jpg"});
  EXPECT_EQ("RKBK", QuadrantLetters("/tmp/black.jpg"));
}

TEST_F(ImagesTest, PicturesOfSeveralFrames) {
  MakeAnimatedGif("/tmp/a.gif", 3, 60, 40);
  const ImageIdentity gif = Identify("/tmp/a.gif");
  EXPECT_EQ("GIF", gif.format);
  EXPECT_EQ(3, gif.frames);
  EXPECT_EQ(60, gif.width);
  MakeMultiPageTiff("/tmp/a.tif", 2);
  EXPECT_EQ("TIFF", Identify("/tmp/a.tif").format);
  EXPECT_EQ(2, Identify("/tmp/a.tif").frames);
  Convert({"/tmp/a.gif[0]", "/tmp/first.jpg"});
  EXPECT_EQ("RGBY", QuadrantLetters("/tmp/first.jpg"));
  Convert({"/tmp/a.tif[1]", "/tmp/second.jpg"});
  EXPECT_EQ("EEEE", QuadrantLetters("/tmp/second.jpg"));
}

TEST_F(ImagesTest, OtherFormatsByExtension) {
  for (const std::string format : {"png", "bmp", "webp", "psd"}) {
    const std::string path = MakeImage("/tmp/a." + format, 60, 40);
    EXPECT_EQ(60, Identify(path).width) << format;
    EXPECT_EQ(40, Identify(path).height) << format;
  }
  EXPECT_EQ("PPM", Identify(MakePpm("/tmp/a.ppm")).format);
}

TEST_F(ImagesTest, WhatIsNoImageHasNoIdentity) {
  WriteFile("/tmp/a.jpg", "no picture");
  EXPECT_EQ("", Identify("/tmp/a.jpg").format);
}

}  // namespace
}  // namespace vela_test
