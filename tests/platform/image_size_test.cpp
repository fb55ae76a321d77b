// Pixel sizes of photos, from their headers.
#include <sys/resource.h>

#include "header/header_reader.h"
#include "platform/platform_fixture.h"
#include "support/build_paths.h"
#include "support/images.h"
#include "support/program.h"

namespace vela_test {
namespace {

std::string SizeOf(const std::string& path) {
  uint32_t width = 7;
  uint32_t height = 8;
  if (VELAIndexImgResGet(path.c_str(), &width, &height) != 0) {
    EXPECT_EQ(width, 7U);
    EXPECT_EQ(height, 8U);
    return "failed";
  }
  return std::to_string(width) + "x" + std::to_string(height);
}

/// Makes an image with ImageMagick: its size, further arguments, and its path, which may begin with
/// the name of a format. Returns what SizeOf gives for the path.
std::string ConvertedSize(const std::string& size, const Strings& arguments,
                          const std::string& output) {
  Strings all = {"-size", size};
  all.insert(all.end(), arguments.begin(), arguments.end());
  all.push_back(output);
  const auto result = RunProgram("/usr/bin/convert", all);
  EXPECT_EQ(result.exitCode, 0) << result.err;
  return SizeOf(output.substr(output.find('/')));
}

JpegRecipe WideRecipe() {
  JpegRecipe recipe;
  recipe.width = 90;
  recipe.height = 40;
  return recipe;
}

class ImageSize : public SandboxTest {
 protected:
  void TearDown() override { vela::EndHeaderReader(); }
};

TEST_F(ImageSize, OfEveryKindThatImageMagickWrites) {
  for (const std::string extension :
       {"jpg", "jpeg", "jpe", "png", "gif", "bmp", "tif", "tiff", "webp", "heic", "heif", "psd"}) {
    // An odd size is padded in HEIF files, and the library returns the padded one.
    const bool isHeif = extension == "heic" || extension == "heif";
    // ImageMagick uses other names for two of these.
    const std::string format = extension == "heif" ? "heic:" : extension == "jpe" ? "jpeg:" : "";
    for (const char* size : {"128x64", isHeif ? "64x128" : "61x19"}) {
      EXPECT_EQ(ConvertedSize(size, {"plasma:"}, format + "/tmp/a." + extension), size)
          << extension;
    }
  }
}

TEST_F(ImageSize, OfAllVariantsOfAKind) {
  const struct {
    const char* size;
    Strings arguments;
    const char* output;
  } cases[] = {
      {"16000x3", {"xc:red"}, "/tmp/wide.jpg"},
      {"70x30", {"plasma:", "-interlace", "JPEG"}, "/tmp/progressive.jpg"},
      {"50x20", {"plasma:", "-define", "webp:lossless=true"}, "/tmp/lossless.webp"},
      {"50x20", {"xc:#ff000080"}, "/tmp/transparent.webp"},
      {"44x33", {"xc:red", "xc:blue"}, "/tmp/animated.webp"},
      {"50x20", {"gradient:", "-interlace", "PNG"}, "png8:/tmp/interlaced.png"},
      {"61x19", {"plasma:", "-endian", "LSB"}, "/tmp/little_endian.tif"},
      {"61x19", {"plasma:", "-endian", "MSB"}, "/tmp/big_endian.tif"},
      {"500x300", {"plasma:"}, "ptif:/tmp/pyramid.tif"},
      {"200x300", {"plasma:", "-compress", "JPEG"}, "/tmp/jpeg.tif"},
      {"33x21", {"plasma:"}, "bmp3:/tmp/version_3.bmp"},
      {"33x21", {"plasma:"}, "bmp:/tmp/newest.bmp"},
      // The format is detected from the content, not from the name.
      {"31x17", {"plasma:"}, "png:/tmp/png.jpg"},
      {"31x17", {"plasma:"}, "jpeg:/tmp/noname"},
  };
  for (const auto& [size, arguments, output] : cases) {
    EXPECT_EQ(ConvertedSize(size, arguments, output), size) << output;
  }
}

TEST_F(ImageSize, OfJpegsWithMetadataInAllColours) {
  JpegRecipe recipe = WideRecipe();
  recipe.exif = recipe.xmp = recipe.iptc = recipe.iccProfile = true;
  recipe.comment = "comment";
  for (const JpegColour colour : {JpegColour::kRgb, JpegColour::kCmyk, JpegColour::kGrey}) {
    recipe.colour = colour;
    EXPECT_EQ(SizeOf(MakeJpeg("/tmp/full.jpg", recipe)), "90x40");
  }
}

TEST_F(ImageSize, IsTheStoredOneWhateverTheOrientation) {
  JpegRecipe recipe = WideRecipe();
  for (recipe.orientation = 1; recipe.orientation <= 8; ++recipe.orientation) {
    EXPECT_EQ(SizeOf(MakeJpeg("/tmp/turned.jpg", recipe)), "90x40");
  }
}

TEST_F(ImageSize, NeedsOnlyTheHeader) {
  EXPECT_EQ(SizeOf(MakeTruncatedJpeg("/tmp/cut.jpg", 256, 192)), "256x192");
  const std::string png = ReadFile(MakeTransparentPng("/tmp/a.png", 52, 21));
  WriteFile("/tmp/cut.png", png.substr(0, 60));
  EXPECT_EQ(SizeOf("/tmp/cut.png"), "52x21");
}

TEST_F(ImageSize, OfFirstPagesAndFrames) {
  EXPECT_EQ(SizeOf(MakeAnimatedGif("/tmp/a.gif", 3, 40, 30)), "40x30");
  EXPECT_EQ(SizeOf(MakeMultiPageTiff("/tmp/a.tif", 3, 40, 30)), "40x30");
}

TEST_F(ImageSize, OfATransparentPng) {
  EXPECT_EQ(SizeOf(MakeTransparentPng("/tmp/a.png", 52, 21)), "52x21");
}

/// The four bytes of a number, little-endian.
std::string LittleEndian(int32_t number) {
  std::string text;
  for (int i = 0; i < 4; ++i) text += static_cast<char>(number >> (8 * i) & 0xff);
  return text;
}

/// The size that is read from the header of a bitmap of these dimensions.
std::string BitmapSize(int32_t width, int32_t height) {
  WriteFile("/tmp/header.bmp", "BM" + LittleEndian(1000) + LittleEndian(0) + LittleEndian(54) +
                                   LittleEndian(40) + LittleEndian(width) + LittleEndian(height) +
                                   std::string(200, '\0'));
  return SizeOf("/tmp/header.bmp");
}

TEST_F(ImageSize, OfBitmapsByTheirHeader) {
  EXPECT_EQ(BitmapSize(33, -21), "33x21") << "top down";
  EXPECT_EQ(BitmapSize(0, 5), "failed");
  EXPECT_EQ(BitmapSize(5, 0), "failed");
  EXPECT_EQ(BitmapSize(-5, 5), "failed");
  WriteFile("/tmp/short.bmp", "BM");
  EXPECT_EQ(SizeOf("/tmp/short.bmp"), "failed");
}

TEST_F(ImageSize, OfAHugePictureCostsNoMemory) {
  BitmapSize(20000, 10000);  // not counted: the first question
  rusage before = {};
  getrusage(RUSAGE_SELF, &before);
  EXPECT_EQ(BitmapSize(20000, 10000), "20000x10000");
  rusage after = {};
  getrusage(RUSAGE_SELF, &after);
  EXPECT_LT(after.ru_maxrss - before.ru_maxrss, 1024) << "KiB more";
}

TEST_F(ImageSize, OfAHugePictureCostsTheReaderNoMemory) {
  constexpr long kPixelsKib = 20000L * 10000 * 3 / 1024;
  InOwnProcess([] {
    EXPECT_EQ(BitmapSize(20000, 10000), "20000x10000");
    vela::EndHeaderReader();
    rusage reader = {};
    getrusage(RUSAGE_CHILDREN, &reader);
    EXPECT_GT(reader.ru_maxrss, 0);
    EXPECT_LT(reader.ru_maxrss, kPixelsKib / 4);
  });
}

TEST_F(ImageSize, OfPixmapsAsRawPhotosAreDecodedTo) {
  EXPECT_EQ(SizeOf(MakePpm("/tmp/a.ppm", 61, 19)), "61x19");
  for (const char* header : {"P6", "P6\n61", "P6\n61 19", "P6\n0 19\n255\n", "P6\n-61 19\n255\n",
                             "P6\nwide high\n255\n", "P9\n61 19\n255\n"}) {
    WriteFile("/tmp/broken.ppm", header);
    EXPECT_EQ(SizeOf("/tmp/broken.ppm"), "failed") << header;
  }
}

TEST_F(ImageSize, FailsForKindsThatAreNoPhotos) {
  for (const char* kind : {"eps:", "pgf:", "tga:"}) {
    const auto made = RunProgram("/usr/bin/convert",
                                 {"-size", "61x19", "xc:red", std::string(kind) + "/tmp/a.jpg"});
    if (made.exitCode != 0) {
      WriteFile("/tmp/a.jpg", "%!PS-Adobe-3.0 EPSF-3.0\n%%BoundingBox: 0 0 61 19\n%%EOF\n");
    }
    EXPECT_EQ(SizeOf("/tmp/a.jpg"), "failed") << kind;
  }
}

TEST_F(ImageSize, FailsForCutAndBrokenFiles) {
  for (const char* extension : {"jpg", "png", "gif", "bmp", "tif", "webp", "psd"}) {
    const std::string path = std::string("/tmp/a.") + extension;
    EXPECT_EQ(ConvertedSize("123x45", {"plasma:"}, path), "123x45");
    const std::string whole = ReadFile(path);
    for (size_t length = 0; length < 64 && length < whole.size(); ++length) {
      WriteFile("/tmp/cut", whole.substr(0, length));
      EXPECT_THAT(SizeOf("/tmp/cut"), testing::AnyOf("failed", "123x45"))
          << extension << " " << length;
    }
    for (size_t at = 0; at < 128 && at < whole.size(); ++at) {
      std::string broken = whole;
      broken[at] = static_cast<char>(~broken[at]);
      WriteFile("/tmp/broken", broken);
      SizeOf("/tmp/broken");
    }
  }
}

TEST_F(ImageSize, FailsForAnythingButAnImage) {
  WriteFile("/tmp/empty.jpg", "");
  WriteFile("/tmp/text.jpg", "This is no picture at all, whatever its name says.\n");
  WriteFile("/tmp/zeros.png", std::string(5000, '\0'));
  for (const char* path :
       {"/tmp/empty.jpg", "/tmp/text.jpg", "/tmp/zeros.png", "/tmp/absent.jpg"}) {
    EXPECT_EQ(SizeOf(path), "failed") << path;
  }
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(SizeOf("/tmp"), "failed");
  EXPECT_EQ(VLIBCErrGet(), EISDIR);
}

TEST_F(ImageSize, DoesNotWaitForPipes) {
  ASSERT_EQ(mkfifo("/tmp/pipe.jpg", 0600), 0);
  EXPECT_EQ(SizeOf("/tmp/pipe.jpg"), "failed");
  EXPECT_EQ(SizeOf("/dev/zero"), "failed");
}

TEST_F(ImageSize, TakesPathsThatLookLikeAddresses) {
  ASSERT_EQ(chdir("/tmp"), 0);
  MakeDirectories("/tmp/http:");
  for (const char* path : {"http://a.jpg", "file:", "-", "data:x", "a.jpg[0]", "jpeg:a"}) {
    ConvertedSize("12x34", {"plasma:"}, "/tmp/source.jpg");
    CopyFile("/tmp/source.jpg", path);
    EXPECT_EQ(SizeOf(path), "12x34") << path;
  }
  ASSERT_EQ(chdir("/"), 0);
}

TEST_F(ImageSize, RefusesNullArguments) {
  uint32_t number = 0;
  EXPECT_EQ(VELAIndexImgResGet(nullptr, &number, &number), -1);
  EXPECT_EQ(VELAIndexImgResGet("/tmp/a.jpg", nullptr, &number), -1);
  EXPECT_EQ(VELAIndexImgResGet("/tmp/a.jpg", &number, nullptr), -1);
}

TEST_F(ImageSize, PrintsNothing) {
  JpegRecipe recipe;
  recipe.exif = true;
  const std::string good = ReadFile(MakeJpeg("/tmp/a.jpg", recipe));
  EXPECT_EQ(PrintedBy([&good] {
              for (size_t at = 2; at < 200 && at < good.size(); ++at) {
                std::string broken = good;
                broken[at] = static_cast<char>(broken[at] ^ 0x55);
                WriteFile("/tmp/broken.jpg", broken);
                SizeOf("/tmp/broken.jpg");
              }
              WriteFile("/tmp/broken.ppm", "P6\nwide high\n");
              SizeOf("/tmp/broken.ppm");
            }),
            "");
}

TEST_F(ImageSize, CanBeReadByThreadsAtOnce) {
  JpegRecipe recipe;
  recipe.exif = recipe.xmp = true;
  MakeJpeg("/tmp/a.jpg", recipe);
  RunInThreads(4, [](int) {
    for (int round = 0; round < 100; ++round) EXPECT_EQ(SizeOf("/tmp/a.jpg"), "64x48");
  });
}

TEST_F(ImageSize, LeavesNoDescriptorOpen) {
  MakeJpeg("/tmp/a.jpg");
  WriteFile("/tmp/text.jpg", "none");
  SizeOf("/tmp/a.jpg");
  ExpectNoDescriptorLeak([] {
    for (int i = 0; i < 10; ++i) {
      SizeOf("/tmp/a.jpg");
      SizeOf("/tmp/text.jpg");
    }
  });
}

TEST_F(ImageSize, OfCameraFiles) {
  const struct {
    const char* name;
    const char* size;
  } cases[] = {
      {"phone_12mp.heic", "4032x3024"},  {"camera_raw.crw", "2160x1440"},
      {"tiny_preview.nef", "3040x2014"}, {"broken_preview.dng", "3516x2328"},
      {"scan.tiff", "635x348"},          {"phone_8mp.jpg", "3264x2448"},
      {"portrait_6.jpg", "600x450"},     {"corrupted.jpg", "3648x2736"},
  };
  // Camera files are not available on every machine; this file is.
  EXPECT_EQ(SizeOf(MakeJpeg("/tmp/own.jpg")), "64x48");
  const std::string directory = SharedMediaDirectory();
  if (directory.empty()) return;
  for (const auto& [name, size] : cases) EXPECT_EQ(SizeOf(directory + "/" + name), size) << name;
}

}  // namespace
}  // namespace vela_test
