// A thumbnail never shows another photo's picture, even when ImageMagick would take a photo's name
// for a pattern or its content for a list of names.
#include "program/real_program_test.h"

namespace vela_test::real {

namespace {

/// Palette indexes of very different colours.
constexpr int kRed = 100;
constexpr int kGreen = 20;

class WrongPicture : public RealProgramTest {
 protected:
  /// Two photos in one directory and two runs; expects that `photo` has its own picture or failure
  /// markers.
  void ExpectOwnOrFailed(const std::string& photo, const std::string& other) {
    SCOPED_TRACE(::testing::PrintToString(photo) + " beside " + ::testing::PrintToString(other));
    RemoveTree(kPhotos);
    MakeDirectories(DirectoryOf(photo));
    MakeDirectories(DirectoryOf(other));
    // Different shapes, so that neither picture can cover the other one completely.
    MakePlainPhoto(InPhotos(photo), kRed, 120, 200);
    MakePlainPhoto(InPhotos(other), kGreen, 200, 120);
    const Strings directories = {DirectoryOf(photo), DirectoryOf(other)};
    Make(directories);
    Make(directories);
    ExpectPicture(InPhotos(photo), kRed);
    ExpectPicture(InPhotos(other), kGreen);
  }

  static std::string DirectoryOf(const std::string& name) {
    const size_t slash = name.rfind('/');
    return slash == std::string::npos ? kPhotos : InPhotos(name.substr(0, slash));
  }

  void ExpectPicture(const std::string& photo, int colour) const {
    for (const Kind& kind : kinds_) {
      if (Exists(ThumbOf(photo, kind))) {
        EXPECT_EQ(PaletteIndexOf(ThumbOf(photo, kind)), colour) << photo << " " << kind.name;
      } else {
        EXPECT_TRUE(Exists(MarkerOf(photo, kind))) << photo << " " << kind.name;
      }
    }
  }
};

}  // namespace

TEST_F(WrongPicture, WildcardsInJpegNames) {
  ExpectOwnOrFailed("[1].jpg", "1.jpg");
  ExpectOwnOrFailed("a[1].jpg", "a1.jpg");
  ExpectOwnOrFailed("*.jpg", "z.jpg");
  ExpectOwnOrFailed("?.jpg", "z.jpg");
  ExpectOwnOrFailed("{y,z}.jpg", "z.jpg");
}

TEST_F(WrongPicture, NumbersInJpegNames) {
  ExpectOwnOrFailed("%d.jpg", "0.jpg");
  ExpectOwnOrFailed("%04d.jpg", "0000.jpg");
  ExpectOwnOrFailed("%%.jpg", "%.jpg");
  ExpectOwnOrFailed("%d/p.jpg", "0/p.jpg");
}

TEST_F(WrongPicture, PrefixesInJpegNames) {
  ExpectOwnOrFailed("jpg:z.jpg", "z.jpg");
  ExpectOwnOrFailed("jpg:d/p.jpg", "d/p.jpg");
  ExpectOwnOrFailed("x.jpg[0].jpg", "x.jpg");
}

TEST_F(WrongPicture, WildcardsInPagedNames) {
  ExpectOwnOrFailed("[1].tif", "1.tif");
  ExpectOwnOrFailed("a[1].tif", "a1.tif");
  ExpectOwnOrFailed("?.gif", "z.gif");
  ExpectOwnOrFailed("{y,z}.gif", "z.gif");
}

TEST_F(WrongPicture, WildcardsThatFindThePagedPhotoToo) {
  ExpectOwnOrFailed("*.tif", "z.tif");
  ExpectOwnOrFailed("a*.gif", "ab.gif");
}

TEST_F(WrongPicture, NumbersInPagedNames) {
  ExpectOwnOrFailed("%d.tif", "0.tif");
  ExpectOwnOrFailed("%04d.gif", "0000.gif");
  ExpectOwnOrFailed("%%.tif", "%.tif");
  ExpectOwnOrFailed("%d/p.tif", "0/p.tif");
}

// ImageMagick drops the percent sign in front of a bracket.
TEST_F(WrongPicture, PropertiesInPagedNames) {
  ExpectOwnOrFailed("%[x].tif", "[x].tif");
  ExpectOwnOrFailed("%[x]/p.tif", "[x]/p.tif");
  ExpectOwnOrFailed("%[/p.gif", "[/p.gif");
}

TEST_F(WrongPicture, PrefixesInPagedNames) {
  ExpectOwnOrFailed("gif:z.gif", "z.gif");
  ExpectOwnOrFailed("gif:d/p.gif", "d/p.gif");
}

// ImageMagick reads a file with a wildcard in its name as a list of further arguments.
TEST_F(WrongPicture, TextThatNamesAnotherPhoto) {
  MakePlainPhoto("/tmp/private.png", kGreen);
  WriteFile(InPhotos("[1].jpg"), "/tmp/private.png\n");
  Make();
  EXPECT_TRUE(IsMarkedFailed(InPhotos("[1].jpg"), kinds_));
}

TEST_F(WrongPicture, TextThatHoldsOptions) {
  MakePlainPhoto("/tmp/private.png", kGreen);
  WriteFile("/tmp/precious", "content");
  WriteFile(InPhotos("[1].jpg"), "/tmp/private.png\n-write\npng:/tmp/precious\n");
  Make();
  EXPECT_EQ(ReadFile("/tmp/precious"), "content");
  EXPECT_TRUE(IsMarkedFailed(InPhotos("[1].jpg"), kinds_));
}

}  // namespace vela_test::real
