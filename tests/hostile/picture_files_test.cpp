// Files that are named like photos and hold something else: pictures that refer to other files,
// scripts, and pictures that claim to be immense.
#include <sys/stat.h>
#include <unistd.h>

#include <cstdint>
#include <map>

#include "hostile/hostile_test.h"
#include "support/named_case.h"

namespace vela_test::hostile {

namespace {

struct Disguise : NamedCase {
  std::string content;
};

const std::string kPrivate = kPrivatePhoto;

std::string Svg(const std::string& body) {
  return "<?xml version=\"1.0\"?>\n<svg width=\"160\" height=\"120\" "
         "xmlns=\"http://www.w3.org/2000/svg\" xmlns:xlink=\"http://www.w3.org/1999/xlink\">" +
         body + "</svg>\n";
}

std::string SvgImage(const std::string& reference) {
  return Svg("<image width=\"160\" height=\"120\" xlink:href=\"" + reference + "\"/>");
}

std::vector<Disguise> References() {
  return {{"Svg", SvgImage(kPrivate)},
          {"SvgFileAddress", SvgImage("file://" + kPrivate)},
          {"SvgWithCoder", SvgImage("jpeg:" + kPrivate)},
          {"SvgText", SvgImage("text:" + std::string(kPrivateText))},
          {"SvgWithoutHeader", SvgImage(kPrivate).substr(22)},
          {"Mvg", "push graphic-context\nviewbox 0 0 160 120\nimage Over 0,0 160,120 '" + kPrivate +
                      "'\npop graphic-context\n"},
          {"Msl", "<?xml version=\"1.0\"?>\n<image><read filename=\"" + kPrivate +
                      "\"/><write filename=\"jpeg:/tmp/victim/new\"/></image>\n"},
          {"TextList", "@" + kPrivate + "\n"},
          {"PixelText",
           "# ImageMagick pixel enumeration: 2,1,255,srgb\n0,0: (255,0,0)  #FF0000\n"
           "1,0: (255,0,0)  #FF0000\n"},
          {"PostScript", "%!PS-Adobe-3.0\n%%BoundingBox: 0 0 160 120\n(" + kPrivate +
                             ") (r) file 512 string readstring pop show showpage\n"},
          {"Pdf", "%PDF-1.4\n1 0 obj<</Type/Catalog/Pages 2 0 R>>endobj\ntrailer<</Root 1 0 R>>\n"},
          {"Html", "<html><body><img src=\"" + kPrivate + "\"></body></html>\n"},
          {"Miff",
           "id=ImageMagick  version=1.0\nclass=DirectClass colors=0 matte=False\n"
           "columns=2 rows=1 depth=8\ncolorspace=sRGB\n\f\n:\x1a"
           "\xff\x01\x01\xff\x01\x01"}};
}

/// Changes the size in the first directory of a TIFF, and of a raw photo that is one.
void ClaimSize(const std::string& path, int width, int height) {
  std::string bytes = ReadFile(path);
  const auto at = [&bytes](size_t place, size_t count) {
    uint32_t value = 0;
    for (size_t i = 0; i < count; ++i) {
      value |= static_cast<uint32_t>(static_cast<uint8_t>(bytes.at(place + i))) << (8 * i);
    }
    return value;
  };
  ASSERT_EQ(bytes.substr(0, 2), "II");
  const auto columns = static_cast<uint32_t>(width);
  const auto rows = static_cast<uint32_t>(height);
  // Width, height, rows in a strip, bytes in a strip.
  const std::map<uint32_t, uint32_t> claims = {
      {256, columns}, {257, rows}, {278, rows}, {279, columns * 2 * rows}};
  const size_t directory = at(4, 4);
  const uint32_t entries = at(directory, 2);
  for (uint32_t i = 0; i < entries; ++i) {
    constexpr uint32_t kLong = 4;
    const size_t entry = directory + 2 + i * 12;
    const uint32_t tag = at(entry, 2);
    const auto claimed = claims.find(tag);
    if (claimed != claims.end()) {
      const uint32_t value = claimed->second;
      bytes[entry + 2] = static_cast<char>(kLong);
      for (size_t byte = 0; byte < 4; ++byte) {
        bytes[entry + 8 + byte] = static_cast<char>(value >> (8 * byte) & 0xffU);
      }
    }
  }
  WriteFile(path, bytes);
}

using PictureFiles = HostileTest;

}  // namespace

class DisguisedFiles : public HostileTest, public ::testing::WithParamInterface<Disguise> {};

// Under names whose pictures are read in different ways.
TEST_P(DisguisedFiles, GetMarkersAndRevealNothing) {
  Strings photos;
  for (const char* extension : {"jpg", "gif", "bmp", "psd", "tif", "webp", "png"}) {
    photos.push_back(InPhotos(std::string("x.") + extension));
    WriteFile(photos.back(), GetParam().content);
  }
  RunInTime();
  for (const std::string& photo : photos) {
    EXPECT_TRUE(IsMarkedFailed(photo, kinds_));
  }
  ExpectNothingRevealed();
}

INSTANTIATE_TEST_SUITE_P(All, DisguisedFiles, ::testing::ValuesIn(References()), CaseName());

// The header of a pixel cache makes the bytes of any file pixels: those of x.cache beside x.mpc.
TEST_F(PictureFiles, PixelCachesAreNotOpened) {
  const Rgb colour = PaletteColour(kPrivateColour);
  Draw({"-size", "160x120",
        "xc:rgb(" + std::to_string(colour.red) + "," + std::to_string(colour.green) + "," +
            std::to_string(colour.blue) + ")",
        "/tmp/private.mpc"});
  chmod("/tmp/private.cache", 0600);
  for (const char* name : {"x.mpc", "x.jpg"}) {
    CopyFile("/tmp/private.mpc", InPhotos(name));
  }
  EXPECT_TRUE(Link("/tmp/private.cache", InPhotos("x.cache")));
  WriteFile(InPhotos("y.jpg"), SvgImage(InPhotos("x.mpc")));
  WriteFile(InPhotos("z.gif"), SvgImage("mpc:" + InPhotos("x.jpg")));
  RunInTime();
  ExpectNothingRevealed();
  for (const char* name : {"x.jpg", "y.jpg", "z.gif"}) {
    EXPECT_TRUE(IsMarkedFailed(InPhotos(name), kinds_));
  }
}

// A short description of a picture that takes long to draw.
TEST_F(PictureFiles, ImmenseDrawingsFailQuickly) {
  const std::string photo = InPhotos("x.jpg");
  WriteFile(photo,
            "<svg xmlns=\"http://www.w3.org/2000/svg\" width=\"9000\" height=\"9000\"><filter "
            "id=\"f\"><feTurbulence baseFrequency=\".5\" numOctaves=\"9999\"/></filter><rect "
            "width=\"9000\" height=\"9000\" filter=\"url(#f)\"/></svg>");
  RunInTime();
  EXPECT_TRUE(IsMarkedFailed(photo, kinds_));
}

// Raw photos that take one page on the disk, being holes, and gigabytes in a decoder.
TEST_F(PictureFiles, ImmenseRawPhotosFailQuickly) {
  constexpr int kSide = 24000;
  const Strings photos = {InPhotos("x.dng"), InPhotos("y.nef")};
  for (const std::string& photo : photos) {
    MakeRawPhoto(photo);
    ClaimSize(photo, kSide, kSide);
    EXPECT_EQ(truncate(photo.c_str(), FileSize(photo) + int64_t{2} * kSide * kSide), 0);
  }
  RunInTime();
  for (const std::string& photo : photos) {
    EXPECT_TRUE(IsMarkedFailed(photo, kinds_));
  }
}

TEST_F(PictureFiles, ImmenseTiffsFailQuickly) {
  const std::string photo = MakeMultiPageTiff(InPhotos("x.tif"), 1);
  ClaimSize(photo, 65535, 65535);
  RunInTime();
  EXPECT_TRUE(IsMarkedFailed(photo, kinds_));
}

// A name that the converter could take for an instruction.
TEST_F(PictureFiles, NamesAreNotInstructions) {
  MakeDirectories(InPhotos("d"));
  for (const char* name : {"@list.jpg", "text:a.jpg", "msl:a.jpg", "a.jpg[0].jpg", "-write.jpg",
                           "|touch new.jpg", "%d.jpg", "~.jpg", "*.jpg"}) {
    MakeJpeg(InPhotos("d/") + name);
  }
  RunInTime({InPhotos("d")});
  EXPECT_FALSE(Exists("/new.jpg"));
  for (const std::string& name : ListDirectory(InPhotos("d"))) {
    EXPECT_TRUE(name == "@eaDir" || HasThumbs(InPhotos("d/") + name, FirstKinds(kinds_)));
  }
}

}  // namespace vela_test::hostile
