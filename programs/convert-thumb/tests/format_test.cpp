// All formats that the converter decodes itself.

#include <sys/stat.h>

#include "converter_fixture.h"
#include "png_chunks.h"
#include "support/build_paths.h"
#include "support/missing_library.h"
#include "support/stub_tool.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr int kWidth = 900;
constexpr int kHeight = 660;

class Formats : public ConverterTest {
 protected:
  /// Makes a picture and expects the converter to make the same thumbnails as ImageMagick, without
  /// its help.
  void ExpectOwn(const std::string& name, const std::vector<std::string>& options,
                 double leastMean = 48) const {
    SCOPED_TRACE(name);
    ExpectOwnPictures(MakePicture(name, kWidth, kHeight, options), UsualOutputs(), leastMean);
  }

  /// Makes a PNG with an exponent of the brightness, in 100,000ths, and no other chunk about
  /// colours than those in `others`.
  std::string MakePngWithGamma(uint32_t exponent, const std::string& others = "") const {
    const std::string path =
        MakePicture("a.png", 300, 200, {"-depth", "8", "-define", "png:exclude-chunk=all"});
    AddToPng(path, others + PngGamma(exponent));
    return path;
  }

  /// The dynamic linker's log of a conversion of the picture.
  std::string LoadedFor(const std::string& source) const {
    ProgramOptions options;
    options.addedEnvironment = {"LD_DEBUG=files"};
    return Convert(source, {ThumbOptions()}, options).err;
  }

  std::string DensityOf(const std::string& name) const {
    return RunProgram("/usr/bin/identify", {"-format", "%[fx:resolution.x]x%[fx:resolution.y] %U",
                                            directory_ + "/" + name})
        .out;
  }

  /// Makes ten truncated versions of a picture and some with wrong bytes, and expects ImageMagick's
  /// exit status for each.
  void ExpectVerdictsOnDamage(const std::string& name,
                              const std::vector<std::string>& options = {}) const {
    const std::string bytes = ReadFile(MakePicture(name, 300, 220, options));
    const std::string damaged = directory_ + "/damaged" + name.substr(name.rfind('.'));
    for (size_t i = 0; i < 10; ++i) {
      WriteFile(damaged, bytes.substr(0, bytes.size() * i / 10));
      ExpectSameVerdict(damaged, {ThumbOptions()});
    }
    for (size_t i = 1; i < 10; ++i) {
      std::string wrong = bytes;
      wrong[bytes.size() * i / 10] = static_cast<char>(wrong[bytes.size() * i / 10] ^ 0x5A);
      WriteFile(damaged, wrong);
      ExpectSameVerdict(damaged, {ThumbOptions()});
    }
  }
};

TEST_F(Formats, Png) {
  ExpectOwn("png24:a.png", {});
  ExpectOwn("png48:a.png", {});
  ExpectOwn("png24:a.png", {"-interlace", "PNG"});
  ExpectOwn("a.png", {"-depth", "8", "-units", "PixelsPerInch", "-density", "300"});
}

TEST_F(Formats, PngOfFewColours) {
  ExpectOwn("png8:a.png", {"-colors", "200"});
  ExpectOwn("png8:a.png", {"-colors", "7"});
}

TEST_F(Formats, PngOfGreys) {
  for (const char* depth : {"1", "2", "4", "8", "16"}) {
    ExpectOwn("a.png",
              {"-colorspace", "Gray", "-depth", depth, "-define",
               "png:bit-depth=" + std::string(depth), "-define", "png:color-type=0"},
              45);
    EXPECT_EQ(DecodeJpeg(directory_ + "/ours0.jpg")->Components(), 1) << depth;
  }
}

TEST_F(Formats, PngOfEveryGamma) {
  const std::string standard = PngChunk("sRGB", std::string(1, '\0'));
  for (const uint32_t exponent : {30000U, 45455U, 74000U, 76000U, 100000U}) {
    SCOPED_TRACE(exponent);
    ExpectSamePictures(MakePngWithGamma(exponent), UsualOutputs(), 48);
    // The other chunk says that the exponent is 0.45455; which of them counts depends on the
    // library.
    ExpectSamePictures(MakePngWithGamma(exponent, standard), UsualOutputs(), 48);
  }
  ExpectOwnPictures(MakePngWithGamma(74000), UsualOutputs(), 48);
}

TEST_F(Formats, TiffOfEveryCompression) {
  for (const char* compression : {"none", "LZW", "Zip", "JPEG", "RLE"}) {
    ExpectOwn("a.tif", {"-depth", "8", "-compress", compression});
  }
  ExpectOwn("a.tif", {"-monochrome", "-compress", "Group4"}, 45);
}

TEST_F(Formats, TiffOfEveryLayout) {
  ExpectOwn("a.tif", {"-depth", "16"});
  ExpectOwn("a.tif", {"-depth", "8", "-endian", "MSB"});
  ExpectOwn("a.tif", {"-depth", "8", "-interlace", "Plane"});
  ExpectOwn("a.tiff", {"-depth", "8", "-define", "tiff:tile-geometry=256x256"});
  ExpectOwn("a.tif", {"-colorspace", "Gray", "-depth", "8"});
  ExpectOwn("a.tif", {"-colorspace", "Gray", "-define", "quantum:polarity=min-is-white"});
  ExpectOwn("a.tif", {"-colors", "200", "-type", "Palette", "-depth", "8"}, 45);
}

TEST_F(Formats, TiffOrientationIsApplied) {
  for (const char* orientation : {"TopRight", "BottomLeft", "RightTop", "LeftBottom"}) {
    ExpectOwn("a.tif", {"-depth", "8", "-orient", orientation});
  }
}

TEST_F(Formats, PortableMaps) {
  ExpectOwn("a.ppm", {"-depth", "8"});
  ExpectOwn("a.ppm", {"-depth", "16"});
  ExpectOwn("a.pgm", {"-depth", "8"});
  ExpectOwn("a.pgm", {"-depth", "16"});
}

TEST_F(Formats, PortableMapWithComments) {
  const std::string map = directory_ + "/a.ppm";
  WriteFile(map, "P6 # one\n# two\n3\n#three\n2 255\n" + std::string("abcdefghijklmnopqr"));
  ExpectOwnPictures(map, UsualOutputs());
}

TEST_F(Formats, Gif) {
  ExpectOwn("a.gif", {});
  ExpectOwn("a.gif", {"-colorspace", "Gray"});
}

TEST_F(Formats, Webp) {
  ExpectOwn("a.webp", {});
  ExpectOwn("a.webp", {"-define", "webp:lossless=true"});
}

TEST_F(Formats, WebpOrientationIsApplied) {
  JpegRecipe recipe;
  recipe.width = 600;
  recipe.height = 400;
  recipe.orientation = 6;
  const std::string jpeg = MakeJpeg(directory_ + "/a.jpg", recipe);
  const std::string webp = directory_ + "/a.webp";
  ASSERT_EQ(RunProgram(kImageMagick, {jpeg, webp}).exitCode, 0);
  // ImageMagick ignores it.
  ExpectSuccess(Convert(webp, UsualOutputs()));
  EXPECT_EQ(QuadrantLetters(directory_ + "/ours0.jpg"), LettersAfterOrientation(6));
}

TEST_F(Formats, Heif) {
  ExpectOwn("a.heic", {}, 42);
  ExpectOwn("a.avif", {}, 42);
}

TEST_F(Formats, HeifOfACameraKeepsItsProfile) {
  const std::string media = SharedMediaDirectory();
  if (media.empty()) {
    return;
  }
  const std::string photo = media + "/phone_12mp.heic";
  ASSERT_EQ(
      RunProgram(kImageMagick, ReferenceArguments(Line(photo, UsualOutputs(), "theirs"))).exitCode,
      0);
  const WithoutImageMagick without;
  ExpectSuccess(Convert(photo, UsualOutputs()));
  for (const char* place : {"0.jpg", "1.jpg", "2.jpg", "3.jpg"}) {
    const std::string ours = directory_ + "/ours" + place;
    const Likeness likeness = Compare(ours, directory_ + "/theirs" + place);
    EXPECT_TRUE(likeness.sameSize);
    EXPECT_GE(likeness.decibels, 40);
    EXPECT_TRUE(ReadJpegMetadata(ours).icc);
  }
}

TEST_F(Formats, Jpeg2000) {
  ExpectOwn("a.jp2", {});
  ExpectOwn("a.jp2", {"-colorspace", "Gray"});
}

TEST_F(Formats, ReadOnlyTheFirstOfSeveralPages) {
  const std::vector<std::string> second = {"-depth", "8", "(", "+clone", "-negate", ")"};
  for (const char* name : {"a.tif", "a.gif", "a.webp", "a.ppm"}) {
    const std::string source = MakePicture(name, 700, 500, second);
    ExpectOwnPictures(source + "[0]", UsualOutputs());
    const WithoutImageMagick without;
    const CommandLine all = Line(source, UsualOutputs(), "all");
    EXPECT_EQ(RunConverter(all.Arguments()).exitCode, 1) << name;
  }
}

TEST_F(Formats, HandsOverFilesThatItReadsDifferently) {
  const std::vector<ThumbOptions> outputs = {ThumbOptions()};
  ExpectHandedOver(MakePicture("a.bmp", 300, 200), outputs);
  ExpectHandedOver(MakePicture("lab.tif", 300, 200, {"-colorspace", "Lab"}), outputs);
  ExpectHandedOver(MakePicture("ycc.tif", 300, 200, {"-colorspace", "YCbCr"}), outputs);
  ExpectHandedOver(MakePngWithGamma(100000), outputs);
  ExpectHandedOver(MakePicture("part.gif", 300, 200, {"-repage", "400x300+10+10"}), outputs);
  ExpectHandedOver(MakePicture("plain.ppm", 300, 200, {"-compress", "none"}), outputs);
  const std::string map = directory_ + "/odd.pgm";
  WriteFile(map, "P5 3 2 100\n" + std::string("abcdef"));
  ExpectHandedOver(map, outputs);
}

TEST_F(Formats, HandsOverAGifWithMuchDataBeforeItsFirstFrame) {
  const std::string gif = MakePicture("a.gif", 300, 200, {"-colors", "256"});
  const std::string bytes = ReadFile(gif);
  constexpr size_t kColoursEnd = 13 + 3 * 256;
  const std::string piece = "\xFF" + std::string(255, 'x');
  const auto delayed = [&](size_t pieces) {
    std::string extension("\x21\x01", 2);
    for (size_t i = 0; i < pieces; ++i) {
      extension += piece;
    }
    return bytes.substr(0, kColoursEnd) + extension + '\0' + bytes.substr(kColoursEnd);
  };
  WriteFile(gif, delayed(10));
  ExpectOwnPictures(gif, {ThumbOptions()});
  WriteFile(gif, delayed(70000));
  ExpectHandedOver(gif, {ThumbOptions()});
}

TEST_F(Formats, AnAnimationsFirstFrameMayBeOpaqueAmongTransparentOnes) {
  // A frame that changes only a part is written with everything else transparent.
  const std::string source =
      MakePicture("a.webp", 300, 200,
                  {"-attenuate", "0.5", "+noise", "Gaussian", "-define", "webp:lossless=true", "(",
                   "+clone", "-fill", "red", "-draw", "rectangle 30,30 100,100", ")"});
  ThumbOptions options = Square(200);
  options.flatten = true;
  ExpectOwnPictures(source + "[0]", {options}, 48);
}

TEST_F(Formats, TransparentFramesOfAnAnimationAreFlattened) {
  const std::string source = MakePicture("a.webp", 900, 660,
                                         {"-alpha", "set", "-channel", "A", "-evaluate", "multiply",
                                          "0.5", "+channel", "(", "+clone", "-flip", ")"});
  ExpectOwnPictures(source + "[0]", UsualOutputs(), 45);
}

TEST_F(Formats, DensityOfTiffHasItsUnit) {
  for (const char* unit : {"PixelsPerInch", "PixelsPerCentimeter"}) {
    const std::string source =
        MakePicture("a.tif", 300, 200, {"-depth", "8", "-units", unit, "-density", "120"});
    ExpectOwnPictures(source, {ThumbOptions()});
    EXPECT_EQ(DensityOf("ours0.jpg"), std::string("120x120 ") + unit);
    EXPECT_EQ(DensityOf("theirs0.jpg"), std::string("120x120 ") + unit);
  }
}

TEST_F(Formats, DamagedTiffIsNotReportedByItsLibrary) {
  const std::string source = MakePicture("a.tif", 300, 200, {"-depth", "8"});
  const std::string bytes = ReadFile(source);
  const WithoutImageMagick without;
  // The directory, which is at the end of the file, is missing or truncated.
  for (const size_t length : {size_t{40}, bytes.size() - 250, bytes.size() - 60}) {
    WriteFile(source, bytes.substr(0, length));
    const ProgramResult result = Convert(source);
    EXPECT_THAT(result.err, Not(HasSubstr("TIFF")));
  }
}

TEST_F(Formats, LibvipsLeavesTheEnvironmentToImageMagick) {
  const std::string source = MakePngWithGamma(100000);
  // The converter can run only ImageMagick, so a shell has to take its place.
  RemoveTool(kImageMagick);
  CopyFile("/bin/sh", kImageMagick);
  ASSERT_EQ(chmod(kImageMagick, 0755), 0);
  const std::string tool = "/usr/vela/lib/convert-thumb";
  MakeDirectories("/usr/vela/lib");
  WriteFile(tool, std::string("#!") + kImageMagick + "\necho \"VIPSHOME is ${VIPSHOME-unset}\"\n");
  ASSERT_EQ(chmod(tool.c_str(), 0755), 0);
  const std::vector<std::string> arguments = Line(source, {ThumbOptions()}, "ours").Arguments();
  ProgramOptions options;
  EXPECT_EQ(RunConverter(arguments, options).out, "VIPSHOME is unset\n");
  options.addedEnvironment = {"VIPSHOME=/opt/vips"};
  EXPECT_EQ(RunConverter(arguments, options).out, "VIPSHOME is /opt/vips\n");
}

TEST_F(Formats, HandsOverFilesNamedLikeARawPhoto) {
  const std::string raw = directory_ + "/a.nef";
  CopyFile(MakePicture("a.tif", 300, 200, {"-depth", "8"}), raw);
  ExpectSameVerdict(raw, {ThumbOptions()});
  EXPECT_FALSE(Exists(directory_ + "/ours0.jpg"));
}

TEST_F(Formats, TheDataDecidesNotTheName) {
  const std::string source = directory_ + "/[a]*%d.jpg";
  CopyFile(MakePicture("png24:a.png", 300, 200), source);
  const WithoutImageMagick without;
  ExpectSuccess(Convert(source));
  EXPECT_TRUE(IsWholeJpeg(directory_ + "/ours0.jpg"));
}

TEST_F(Formats, VerdictOnDamagedPng) {
  ExpectVerdictsOnDamage("png24:a.png");
  ExpectVerdictsOnDamage("png24:a.png", {"-interlace", "PNG"});
}

TEST_F(Formats, VerdictOnOtherDamagedFormats) {
  ExpectVerdictsOnDamage("a.tif", {"-depth", "8", "-compress", "LZW"});
  ExpectVerdictsOnDamage("a.ppm", {"-depth", "8"});
  ExpectVerdictsOnDamage("a.webp");
  ExpectVerdictsOnDamage("a.heic");
  ExpectVerdictsOnDamage("a.jp2");
}

TEST_F(Formats, LeavesNothingOfADamagedPhoto) {
  const std::string bytes = ReadFile(MakePicture("png24:a.png", 300, 220));
  const std::string cut = directory_ + "/cut.png";
  WriteFile(cut, bytes.substr(0, bytes.size() / 2));
  const ProgramResult result = Convert(cut, UsualOutputs());
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("cannot decode the photo"));
  EXPECT_FALSE(Exists(directory_ + "/ours0.jpg"));
}

TEST_F(Formats, PicturesThatAreDecodedWholeKeepToTheMemoryLimit) {
  // 4000 x 3000 pixels of three bytes take 36 megabytes.
  const std::vector<ThumbOptions> outputs = {ThumbOptions()};
  const std::string whole = MakePicture("a.webp", 4000, 3000);
  const std::string streamed = MakePicture("a.png", 4000, 3000, {"-depth", "8", "-quality", "10"});
  SetMemoryLimit("30000000");
  const ProgramResult refused = Convert(whole, outputs);
  EXPECT_EQ(refused.exitCode, 1);
  EXPECT_THAT(refused.err, HasSubstr("too much memory"));
  EXPECT_EQ(Convert(streamed, outputs).exitCode, 0);
}

TEST_F(Formats, SharpeningKeepsToTheMemoryLimit) {
  // 101 source rows and as many blurred ones, of 60,000 floats, take 48 megabytes.
  ThumbOptions options = Square(60000);
  options.unsharp = "50x10+1+0";
  const std::string map = directory_ + "/wide.pgm";
  WriteFile(map, "P5 60000 8 255\n" + std::string(60000 * 8, 'x'));
  const std::vector<std::string> arguments = Line(map, {options}, "ours").Arguments();
  SetMemoryLimit("40000000");
  const ProgramResult refused = RunConverter(arguments);
  EXPECT_EQ(refused.exitCode, 1);
  EXPECT_THAT(refused.err, HasSubstr("too much memory"));
  SetMemoryLimit("100000000");
  EXPECT_EQ(RunConverter(arguments).exitCode, 0);
}

TEST_F(Formats, ReportsWhyAThumbnailCannotBeEncoded) {
  const ThumbOptions wide = Square(65535);
  const std::string map = directory_ + "/wide.ppm";
  std::string samples(65535 * 3, 'x');
  samples.front() = 'a';
  WriteFile(map, "P6 65535 1 255\n" + samples);
  for (const std::vector<ThumbOptions>& outputs :
       {std::vector<ThumbOptions>{wide}, {wide, ThumbOptions()}}) {
    const ProgramResult result = Convert(map, outputs);
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_THAT(result.err, HasSubstr("65500"));
    EXPECT_EQ(result.err.find('\n'), result.err.size() - 1) << result.err;
  }
}

TEST_F(Formats, JpegAndPortableMapNeedNoLibvips) {
  EXPECT_THAT(LoadedFor(MakePicture("a.jpg", 300, 200)), Not(HasSubstr("libvips")));
  EXPECT_THAT(LoadedFor(MakePicture("a.ppm", 300, 200)), Not(HasSubstr("libvips")));
  EXPECT_THAT(LoadedFor(MakePicture("a.png", 300, 200)), HasSubstr("libvips"));
}

TEST_F(Formats, OnlyHeifLoadsAModuleOfLibvips) {
  EXPECT_THAT(LoadedFor(MakePicture("a.png", 300, 200)), Not(HasSubstr("vips-modules")));
  EXPECT_THAT(LoadedFor(MakePicture("a.heic", 300, 200)), HasSubstr("vips-heif.so"));
}

TEST_F(Formats, HandsOverWithoutLibvips) {
  const std::string source = MakePicture("a.png", 300, 200);
  const MissingLibrary missing("libvips");
  const std::vector<std::string> arguments = Line(source, {ThumbOptions()}, "ours").Arguments();
  const ProgramResult result = RunConverter(arguments);
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.err, "");
  const WithoutImageMagick without;
  EXPECT_EQ(RunConverter(arguments).exitCode, 1);
}

}  // namespace
}  // namespace vela_test
