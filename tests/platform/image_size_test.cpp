// Pixel sizes of photos, from their headers.
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <thread>
#include <vector>

#include "platform/forked_call.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "support/build_paths.h"
#include "support/files.h"
#include "support/images.h"
#include "support/program.h"
#include "support/sandbox.h"

namespace {

using vela_test::WriteFile;

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

void Convert(std::vector<std::string> arguments) {
  const auto result = vela_test::RunProgram("/usr/bin/convert", arguments);
  ASSERT_EQ(result.exitCode, 0) << result.err;
}

class ImageSize : public vela_test::SandboxTest {};

TEST_F(ImageSize, OfEveryKindThatImageMagickWrites) {
  for (const char* extension :
       {"jpg", "jpeg", "jpe", "png", "gif", "bmp", "tif", "tiff", "webp", "heic", "heif", "psd"}) {
    // An odd size is padded in HEIF files, and the library tells the padded one.
    const bool isHeif = std::string(extension).compare(0, 3, "hei") == 0;
    for (const char* size : {"128x64", isHeif ? "64x128" : "61x19"}) {
      std::string path = std::string("/tmp/a.") + extension;
      // Two of these ImageMagick knows under another name only.
      const std::string kind = std::string(extension) == "heif"  ? "heic:"
                               : std::string(extension) == "jpe" ? "jpeg:"
                                                                 : "";
      Convert({"-size", size, "plasma:", kind + path});
      EXPECT_EQ(SizeOf(path), size) << extension;
    }
  }
}

TEST_F(ImageSize, OfJpegsOfAllSorts) {
  Convert({"-size", "16000x3", "xc:red", "/tmp/wide.jpg"});
  EXPECT_EQ(SizeOf("/tmp/wide.jpg"), "16000x3");
  Convert({"-size", "70x30", "plasma:", "-interlace", "JPEG", "/tmp/progressive.jpg"});
  EXPECT_EQ(SizeOf("/tmp/progressive.jpg"), "70x30");
  vela_test::JpegRecipe recipe;
  recipe.width = 90;
  recipe.height = 40;
  recipe.exif = recipe.xmp = recipe.iptc = recipe.iccProfile = true;
  recipe.comment = "comment";
  EXPECT_EQ(SizeOf(vela_test::MakeJpeg("/tmp/full.jpg", recipe)), "90x40");
  recipe.colour = vela_test::JpegColour::kCmyk;
  EXPECT_EQ(SizeOf(vela_test::MakeJpeg("/tmp/cmyk.jpg", recipe)), "90x40");
  recipe.colour = vela_test::JpegColour::kGrey;
  EXPECT_EQ(SizeOf(vela_test::MakeJpeg("/tmp/grey.jpg", recipe)), "90x40");
}

TEST_F(ImageSize, IsTheStoredOneWhateverTheOrientation) {
  vela_test::JpegRecipe recipe;
  recipe.width = 90;
  recipe.height = 40;
  for (recipe.orientation = 1; recipe.orientation <= 8; ++recipe.orientation) {
    EXPECT_EQ(SizeOf(vela_test::MakeJpeg("/tmp/turned.jpg", recipe)), "90x40");
  }
}

TEST_F(ImageSize, NeedsTheHeaderOnly) {
  EXPECT_EQ(SizeOf(vela_test::MakeTruncatedJpeg("/tmp/cut.jpg", 256, 192)), "256x192");
  const std::string png = vela_test::ReadFile(vela_test::MakeTransparentPng("/tmp/a.png", 52, 21));
  WriteFile("/tmp/cut.png", png.substr(0, 60));
  EXPECT_EQ(SizeOf("/tmp/cut.png"), "52x21");
}

TEST_F(ImageSize, IsToldByTheContentNotTheName) {
  Convert({"-size", "31x17", "plasma:", "png:/tmp/a.jpg"});
  EXPECT_EQ(SizeOf("/tmp/a.jpg"), "31x17");
  Convert({"-size", "31x17", "plasma:", "jpeg:/tmp/noname"});
  EXPECT_EQ(SizeOf("/tmp/noname"), "31x17");
}

TEST_F(ImageSize, OfFirstPagesAndFrames) {
  EXPECT_EQ(SizeOf(vela_test::MakeAnimatedGif("/tmp/a.gif", 3, 40, 30)), "40x30");
  EXPECT_EQ(SizeOf(vela_test::MakeMultiPageTiff("/tmp/a.tif", 3, 40, 30)), "40x30");
  Convert({"-size", "44x33", "xc:red", "xc:blue", "/tmp/a.webp"});
  EXPECT_EQ(SizeOf("/tmp/a.webp"), "44x33");
}

TEST_F(ImageSize, OfWebpsOfAllSorts) {
  Convert({"-size", "50x20", "plasma:", "-define", "webp:lossless=true", "/tmp/a.webp"});
  EXPECT_EQ(SizeOf("/tmp/a.webp"), "50x20");
  Convert({"-size", "50x20", "xc:#ff000080", "/tmp/b.webp"});
  EXPECT_EQ(SizeOf("/tmp/b.webp"), "50x20");
}

TEST_F(ImageSize, OfPngsOfAllSorts) {
  EXPECT_EQ(SizeOf(vela_test::MakeTransparentPng("/tmp/a.png", 52, 21)), "52x21");
  Convert({"-size", "50x20", "gradient:", "-interlace", "PNG", "png8:/tmp/b.png"});
  EXPECT_EQ(SizeOf("/tmp/b.png"), "50x20");
}

TEST_F(ImageSize, OfTiffsOfAllSorts) {
  for (const char* endian : {"LSB", "MSB"}) {
    Convert({"-size", "61x19", "plasma:", "-endian", endian, "/tmp/a.tif"});
    EXPECT_EQ(SizeOf("/tmp/a.tif"), "61x19") << endian;
  }
  Convert({"-size", "500x300", "plasma:", "ptif:/tmp/pyramid.tif"});
  EXPECT_EQ(SizeOf("/tmp/pyramid.tif"), "500x300");
  Convert({"-size", "200x300", "plasma:", "-compress", "JPEG", "/tmp/jpeg.tif"});
  EXPECT_EQ(SizeOf("/tmp/jpeg.tif"), "200x300");
}

std::string LittleEndian(uint32_t number, int bytes) {
  std::string text;
  for (int i = 0; i < bytes; ++i) text += static_cast<char>(number >> (8 * i) & 0xff);
  return text;
}

std::string BitmapHeader(const std::string& infoHeader) {
  return "BM" + LittleEndian(1000, 4) + LittleEndian(0, 4) + LittleEndian(54, 4) + infoHeader +
         std::string(200, '\0');
}

TEST_F(ImageSize, OfBitmapsOfAllVersions) {
  for (const char* version : {"bmp3:", "bmp:"}) {
    Convert({"-size", "33x21", "plasma:", std::string(version) + "/tmp/a.bmp"});
    EXPECT_EQ(SizeOf("/tmp/a.bmp"), "33x21") << version;
  }
  const std::string topDown =
      LittleEndian(40, 4) + LittleEndian(33, 4) + LittleEndian(static_cast<uint32_t>(-21), 4);
  WriteFile("/tmp/down.bmp", BitmapHeader(topDown));
  EXPECT_EQ(SizeOf("/tmp/down.bmp"), "33x21");
}

TEST_F(ImageSize, OfAHugePictureCostsNoMemory) {
  WriteFile("/tmp/huge.bmp",
            BitmapHeader(LittleEndian(40, 4) + LittleEndian(20000, 4) + LittleEndian(10000, 4)));
  SizeOf("/tmp/huge.bmp");  // what the library sets up once is not counted
  rusage before = {};
  getrusage(RUSAGE_SELF, &before);
  EXPECT_EQ(SizeOf("/tmp/huge.bmp"), "20000x10000");
  rusage after = {};
  getrusage(RUSAGE_SELF, &after);
  EXPECT_LT(after.ru_maxrss - before.ru_maxrss, 1024) << "KiB more";
}

TEST_F(ImageSize, OfBitmapsThatHaveNone) {
  for (const auto& [width, height] : {std::pair(0, 5), std::pair(5, 0), std::pair(-5, 5)}) {
    WriteFile("/tmp/none.bmp",
              BitmapHeader(LittleEndian(40, 4) + LittleEndian(static_cast<uint32_t>(width), 4) +
                           LittleEndian(static_cast<uint32_t>(height), 4)));
    EXPECT_EQ(SizeOf("/tmp/none.bmp"), "failed");
  }
  WriteFile("/tmp/short.bmp", "BM");
  EXPECT_EQ(SizeOf("/tmp/short.bmp"), "failed");
}

TEST_F(ImageSize, OfPixmapsAsRawPhotosAreDecodedTo) {
  EXPECT_EQ(SizeOf(vela_test::MakePpm("/tmp/a.ppm", 61, 19)), "61x19");
  for (const char* header : {"P6", "P6\n61", "P6\n61 19", "P6\n0 19\n255\n", "P6\n-61 19\n255\n",
                             "P6\nwide high\n255\n", "P9\n61 19\n255\n"}) {
    WriteFile("/tmp/broken.ppm", header);
    EXPECT_EQ(SizeOf("/tmp/broken.ppm"), "failed") << header;
  }
}

TEST_F(ImageSize, IsNotToldOfKindsThatAreNoPhotos) {
  for (const char* kind : {"eps:", "pgf:", "tga:"}) {
    const auto made = vela_test::RunProgram(
        "/usr/bin/convert", {"-size", "61x19", "xc:red", std::string(kind) + "/tmp/a.jpg"});
    if (made.exitCode != 0) {
      WriteFile("/tmp/a.jpg", "%!PS-Adobe-3.0 EPSF-3.0\n%%BoundingBox: 0 0 61 19\n%%EOF\n");
    }
    EXPECT_EQ(SizeOf("/tmp/a.jpg"), "failed") << kind;
  }
}

TEST_F(ImageSize, FailsForCutAndBrokenFiles) {
  for (const char* extension : {"jpg", "png", "gif", "bmp", "tif", "webp", "psd"}) {
    const std::string path = std::string("/tmp/a.") + extension;
    Convert({"-size", "123x45", "plasma:", path});
    const std::string whole = vela_test::ReadFile(path);
    for (size_t length = 0; length < 64 && length < whole.size(); ++length) {
      WriteFile("/tmp/cut", whole.substr(0, length));
      const std::string cut = SizeOf("/tmp/cut");
      EXPECT_TRUE(cut == "failed" || cut == "123x45") << extension << " " << length << ": " << cut;
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
  EXPECT_EQ(SizeOf("/tmp/empty.jpg"), "failed");
  EXPECT_EQ(SizeOf("/tmp/text.jpg"), "failed");
  EXPECT_EQ(SizeOf("/tmp/zeros.png"), "failed");
  EXPECT_EQ(SizeOf("/tmp/absent.jpg"), "failed");
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
  vela_test::MakeDirectories("/tmp/http:");
  for (const char* path : {"http://a.jpg", "file:", "-", "data:x", "a.jpg[0]", "jpeg:a"}) {
    Convert({"-size", "12x34", "plasma:", "/tmp/source.jpg"});
    WriteFile(path, vela_test::ReadFile("/tmp/source.jpg"));
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
  vela_test::JpegRecipe recipe;
  recipe.exif = true;
  const std::string good = vela_test::ReadFile(vela_test::MakeJpeg("/tmp/a.jpg", recipe));
  const int result = platform_test::RunForked([&good] {
    if (freopen("/tmp/printed", "w", stderr) == nullptr) return 1;
    for (size_t at = 2; at < 200 && at < good.size(); ++at) {
      std::string broken = good;
      broken[at] = static_cast<char>(broken[at] ^ 0x55);
      WriteFile("/tmp/broken.jpg", broken);
      SizeOf("/tmp/broken.jpg");
    }
    WriteFile("/tmp/broken.ppm", "P6\nwide high\n");
    SizeOf("/tmp/broken.ppm");
    fflush(stderr);
    return 0;
  });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(vela_test::ReadFile("/tmp/printed"), "");
}

TEST_F(ImageSize, CanBeReadByThreadsAtOnce) {
  vela_test::JpegRecipe recipe;
  recipe.exif = recipe.xmp = true;
  vela_test::MakeJpeg("/tmp/a.jpg", recipe);
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([] {
      for (int round = 0; round < 100; ++round) EXPECT_EQ(SizeOf("/tmp/a.jpg"), "64x48");
    });
  }
  for (std::thread& thread : threads) thread.join();
}

TEST_F(ImageSize, LeavesNoDescriptorOpen) {
  vela_test::MakeJpeg("/tmp/a.jpg");
  WriteFile("/tmp/text.jpg", "none");
  SizeOf("/tmp/a.jpg");
  const int before = platform_test::CountDescriptors();
  for (int i = 0; i < 10; ++i) {
    SizeOf("/tmp/a.jpg");
    SizeOf("/tmp/text.jpg");
  }
  EXPECT_EQ(platform_test::CountDescriptors(), before);
}

struct CameraFile {
  const char* name;
  const char* size;
};

constexpr CameraFile kCameraFiles[] = {
    {"phone_12mp.heic", "4032x3024"},  {"camera_raw.crw", "2160x1440"},
    {"tiny_preview.nef", "3040x2014"}, {"broken_preview.dng", "3516x2328"},
    {"scan.tiff", "635x348"},          {"phone_8mp.jpg", "3264x2448"},
    {"portrait_6.jpg", "600x450"},     {"corrupted.jpg", "3648x2736"},
};

TEST_F(ImageSize, OfCameraFiles) {
  // The one file that every machine has; camera files come on top of it where there are any.
  EXPECT_EQ(SizeOf(vela_test::MakeJpeg("/tmp/own.jpg")), "64x48");
  const std::string directory = vela_test::SharedMediaDirectory();
  if (directory.empty()) return;
  for (const CameraFile& file : kCameraFiles) {
    EXPECT_EQ(SizeOf(directory + "/" + file.name), file.size) << file.name;
  }
}

}  // namespace
