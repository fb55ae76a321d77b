// Files that are named like photos and hold something else: pictures that refer to other files,
// scripts, and pictures that claim to be immense.
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>

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

/// The header of a pixel cache: the pixels are those of a file of the same name with ".cache".
std::string PixelCacheHeader() {
  return "id=MagickCache\nquantum-depth=16\nclass=DirectClass colors=0 alpha-trait=Undefined\n"
         "columns=8 rows=8 depth=16\ncolorspace=sRGB\nnumber-channels=3 number-meta-channels=0\n"
         "\f\n:\x1a";
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

TEST_F(PictureFiles, PixelCachesAreNotOpened) {
  for (const char* extension : {"jpg", "gif", "bmp", "psd", "tif"}) {
    const std::string name = std::string("x") + extension;
    WriteFile(InPhotos(name + "." + extension), PixelCacheHeader());
    EXPECT_TRUE(Link(kPrivatePhoto, InPhotos(name + ".cache")));
    CopyFile(kPrivatePhoto, InPhotos(name + "." + extension + ".cache"));
  }
  RunInTime();
  for (const char* extension : {"jpg", "gif", "bmp", "psd", "tif"}) {
    EXPECT_TRUE(IsMarkedFailed(InPhotos(std::string("x") + extension + "." + extension), kinds_));
  }
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
