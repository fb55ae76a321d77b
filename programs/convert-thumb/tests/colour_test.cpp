// Colours other than plain red, green and blue: inks, transparency, profiles.

#include <array>
#include <vector>

#include "converter_fixture.h"
#include "decoding/pixel_rows.h"
#include "picture/colour_conversion.h"

using namespace vela;

namespace vela_test {
namespace {

constexpr uint16_t kLight = 65535;

Picture OnePixel(std::vector<uint16_t> samples) {
  Picture picture(1, 1, static_cast<int>(samples.size()));
  picture.samples = std::move(samples);
  return picture;
}

TEST(ColourConversion, InksAbsorbLight) {
  // Cyan ink halves the red, black ink halves every colour.
  Picture picture = OnePixel({32768, kLight, kLight, 32768});
  ConvertToRgb(picture, ColourSpace::kCmyk);
  EXPECT_EQ(picture.channels, 3);
  EXPECT_EQ(picture.samples, (std::vector<uint16_t>{16384, 32768, 32768}));
}

TEST(ColourConversion, BrightnessAndDifferencesMakeColours) {
  // The middle of both differences is grey; full red has 30 percent of the brightness.
  Picture grey = OnePixel({20000, 32768, 32768});
  ConvertToRgb(grey, ColourSpace::kLumaChroma);
  EXPECT_EQ(grey.samples, (std::vector<uint16_t>{20000, 20000, 20000}));
  Picture red = OnePixel({19595, 21710, kLight});
  ConvertToRgb(red, ColourSpace::kLumaChroma);
  EXPECT_GT(red.samples[0], 65400);
  EXPECT_LT(red.samples[1], 150);
  EXPECT_LT(red.samples[2], 150);
}

TEST(ColourConversion, KeepsOtherSpaces) {
  for (const ColourSpace space : {ColourSpace::kGrey, ColourSpace::kRgb}) {
    Picture picture = OnePixel({1, 2, 3});
    ConvertToRgb(picture, space);
    EXPECT_EQ(picture.samples, (std::vector<uint16_t>{1, 2, 3}));
  }
}

TEST(PixelRows, FlattenTransparencyOnItsBackground) {
  const std::array<uint8_t, 8> row = {255, 0, 0, 255, 255, 0, 0, 0};
  alignas(2) std::array<uint8_t, 12> out = {};
  const Background background = {0, 0, kBrightest};
  ChangeRow({row.data(), 2, 4, 1}, RowChange::kOnBackground, background, out.data());
  const auto* const samples = reinterpret_cast<const uint16_t*>(out.data());
  EXPECT_EQ(std::vector<uint16_t>(samples, samples + 6),
            (std::vector<uint16_t>{kLight, 0, 0, 0, 0, kLight}));
}

TEST(PixelRows, ReportTheResultOfAChange) {
  EXPECT_EQ(ChangedBands(RowChange::kOnBackground, 2), 1);
  EXPECT_EQ(ChangedBands(RowChange::kLumaChroma, 4), 3);
  EXPECT_EQ(ChangedBands(RowChange::kInvert, 4), 4);
  EXPECT_EQ(ChangedSampleSize(RowChange::kNone, 1), 1U);
  EXPECT_EQ(ChangedSampleSize(RowChange::kOnBackground, 1), 2U);
}

class Colours : public ConverterTest {
 protected:
  void ExpectOwn(const std::string& name, const std::vector<std::string>& options,
                 double leastMean = 45) const {
    SCOPED_TRACE(name);
    ExpectOwnPictures(MakePicture(name, 900, 660, options), UsualOutputs(), leastMean);
  }
};

/// Makes the picture transparent according to the brightness of another one.
std::vector<std::string> WithSoftOpacity(std::vector<std::string> options) {
  std::vector<std::string> all = {"(",      "+clone", "-flip",    "-colorspace", "Gray",      ")",
                                  "-alpha", "off",    "-compose", "CopyOpacity", "-composite"};
  all.insert(all.end(), options.begin(), options.end());
  return all;
}

TEST_F(Colours, InkJpeg) {
  ExpectOwn("a.jpg", {"-colorspace", "CMYK"});
  // Large enough to be decoded at a fraction of its size.
  ExpectOwnPictures(MakePicture("b.jpg", 4000, 3000, {"-colorspace", "CMYK"}), UsualOutputs());
}

TEST_F(Colours, InkTiff) {
  ExpectOwn("a.tif", {"-colorspace", "CMYK", "-depth", "8"});
  ExpectOwn("a.tif", {"-colorspace", "CMYK", "-depth", "16"});
}

TEST_F(Colours, InkLosesItsProfile) {
  const std::string profile = directory_ + "/profile.icc";
  WriteFile(profile, SrgbProfile());
  for (const char* name : {"a.jpg", "a.tif"}) {
    const std::string source =
        MakePicture(name, 300, 200, {"-colorspace", "CMYK", "-profile", profile});
    ASSERT_NE(ReadFile(source).find(SrgbProfile().substr(0, 128)), std::string::npos);
    ExpectOwnPictures(source, UsualOutputs());
    EXPECT_FALSE(ReadJpegMetadata(directory_ + "/ours0.jpg").icc);
  }
}

TEST_F(Colours, InkThatIsNotConvertedIsHandedOver) {
  ThumbOptions options;
  options.convertToSrgb = false;
  for (const char* name : {"a.jpg", "a.tif"}) {
    ExpectHandedOver(MakePicture(name, 300, 200, {"-colorspace", "CMYK"}), {options});
  }
}

TEST_F(Colours, HeifThatIsNotConvertedIsLikeImageMagicks) {
  ThumbOptions options;
  options.convertToSrgb = false;
  const std::string photo = MakePicture("a.heic", 300, 200);
  if (vela::kImageMagickVersion == 6) {  // reads it as brightness and colour differences
    ExpectHandedOver(photo, {options});
  } else {
    ExpectOwnPictures(photo, {options}, 42);
  }
}

TEST_F(Colours, TransparentPicturesAreFlattened) {
  ExpectOwn("png32:a.png", WithSoftOpacity({}));
  ExpectOwn("png64:a.png", WithSoftOpacity({}));
  ExpectOwn("a.png", WithSoftOpacity({"-colorspace", "Gray", "-define", "png:color-type=4"}));
  ExpectOwn("a.tif", WithSoftOpacity({"-depth", "8"}));
  ExpectOwn("a.tif", WithSoftOpacity({"-depth", "8", "-define", "tiff:alpha=associated"}), 40);
  ExpectOwn("a.webp", WithSoftOpacity({}));
  ExpectOwn("a.jp2", WithSoftOpacity({}));
  if (vela::kImageMagickVersion > 6) {  // version 6 ignores the opacity
    ExpectOwn("a.heic", WithSoftOpacity({}), 42);
  }
}

TEST_F(Colours, HardEdgesOfTransparencyAreFlattened) {
  const std::vector<std::string> hard =
      WithSoftOpacity({"-channel", "A", "-threshold", "50%", "+channel", "-colors", "100"});
  ExpectOwn("png8:a.png", hard, 41);
  if (vela::kImageMagickVersion == 6) {
    ExpectOwn("a.gif", hard, 42);
  } else {  // leaves a pattern of holes at the edges in its thumbnails of a GIF, but not of a PNG
    const std::string gif = MakePicture("a.gif", 900, 660, hard);
    const std::string png = directory_ + "/same.png";
    ExpectSuccess(RunProgram(kImageMagick, {gif, "png32:" + png}));
    ExpectSuccess(Convert(gif, UsualOutputs()));
    ExpectSuccess(
        RunProgram(kImageMagick, ReferenceArguments(Line(png, UsualOutputs(), "theirs"))));
    for (const char* place : {"0.jpg", "1.jpg", "2.jpg", "3.jpg"}) {
      EXPECT_GE(Compare(directory_ + "/ours" + place, directory_ + "/theirs" + place).decibels, 38)
          << place;
    }
  }
}

TEST_F(Colours, TransparentPicturesShowTheirOwnBackground) {
  ExpectOwn("png32:a.png",
            WithSoftOpacity({"-background", "#3080C0", "-define", "png:include-chunk=bKGD"}));
  ExpectOwn("png64:a.png",
            WithSoftOpacity({"-background", "#3080C0", "-define", "png:include-chunk=bKGD"}));
}

TEST_F(Colours, TransparentPicturesThatAreNotFlattenedAreHandedOver) {
  std::vector<ThumbOptions> outputs = UsualOutputs();
  outputs.front().flatten = false;
  ExpectHandedOver(MakePicture("png32:a.png", 300, 200, WithSoftOpacity({})), outputs);
}

TEST_F(Colours, FullyTransparentPicturesAreFlattened) {
  const std::string path = directory_ + "/none.png";
  ASSERT_EQ(RunProgram(kImageMagick, {"-size", "300x200", "xc:none", path}).exitCode, 0);
  ExpectOwnPictures(path, UsualOutputs());
}

TEST_F(Colours, ProfileIsKept) {
  const std::string profile = directory_ + "/profile.icc";
  WriteFile(profile, SrgbProfile());
  for (const char* name : {"png24:a.png", "png48:a.png", "a.tif", "a.webp"}) {
    ExpectOwn(name, {"-profile", profile, "-depth", "8"});
    EXPECT_TRUE(ReadJpegMetadata(directory_ + "/ours0.jpg").icc) << name;
    EXPECT_TRUE(ReadJpegMetadata(directory_ + "/ours3.jpg").icc) << name;
  }
}

}  // namespace
}  // namespace vela_test
