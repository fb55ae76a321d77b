// What a killed run may leave beside the thumbnails is removed by the next run over the directory.
#include <algorithm>

#include "hostile/hostile_test.h"

namespace vela_test::hostile {

namespace {

/// Files of the program, and of its converter and ImageMagick beside it.
const char* const kLeftovers[] = {"VELAPHOTO.tmp.aBcDeF",
                                  "VELAPHOTO.tmp.aBcDeF.jpg",
                                  "VELAPHOTO.tmp.12345",
                                  "Temp_0.jpg",
                                  "Temp_90.jpg",
                                  "Temp_180.jpg",
                                  "Temp_270.jpg",
                                  "RAW_TEMP.ppm",
                                  "magick-aBcDeFgHiJkLmNoP",
                                  "VELAPHOTO_THUMB_RAW.jpg"};

/// Files of others, whatever they resemble.
const char* const kForeign[] = {"VELAPHOTO_FILM.flv", "notes.txt", "Temp_0.png", "RAW.ppm",
                                "VELAPHOTO.txt"};

class Leftovers : public HostileTest {
 protected:
  void SetUp() override {
    HostileTest::SetUp();
    MakeJpeg(InPhotos("a.jpg"));
    MakeRawPhoto(InPhotos("b.dng"), RawRecipeOf());
    Make();
    Make();
    complete_ = ListTree(kPhotos);
  }

  static Strings Folders() { return {InPhotos("@eaDir/a.jpg"), InPhotos("@eaDir/b.dng")}; }

  Strings complete_;
};

}  // namespace

TEST_F(Leftovers, AreRemovedBesideCompleteThumbnails) {
  const auto thumbs = ThumbsBelow(kPhotos);
  for (const std::string& folder : Folders()) {
    for (const char* name : kLeftovers) {
      WriteFile(folder + "/" + name, "half");
    }
  }
  Make();
  EXPECT_EQ(ListTree(kPhotos), complete_);
  EXPECT_EQ(ThumbsBelow(kPhotos), thumbs);
}

TEST_F(Leftovers, AreRemovedBeforeThumbnailsAreMade) {
  for (const std::string& folder : Folders()) {
    RemoveTree(folder);
    for (const char* name : kLeftovers) {
      WriteFile(folder + "/" + name, "half");
    }
  }
  Make();
  Make();
  EXPECT_EQ(ListTree(kPhotos), complete_);
  for (const char* photo : {"a.jpg", "b.dng"}) {
    EXPECT_TRUE(HasThumbs(InPhotos(photo), kinds_));
  }
}

TEST_F(Leftovers, ThatAreLinksOrPipesAreRemovedThemselves) {
  for (const std::string& folder : Folders()) {
    for (const char* name : kLeftovers) {
      const std::string path = folder + "/" + name;
      ActAs(kAttacker, [&] { return name[0] == 'V' ? Link(kPrivateText, path) : Fifo(path); });
    }
  }
  RunInTime();
  EXPECT_EQ(ListTree(kPhotos), complete_);
}

TEST_F(Leftovers, DoNotIncludeFilesOfOthers) {
  Strings expected = complete_;
  for (const std::string& folder : Folders()) {
    for (const char* name : kForeign) {
      WriteFile(folder + "/" + name, "foreign");
      expected.push_back(folder.substr(std::string(kPhotos).size() + 1) + "/" + name);
    }
  }
  std::sort(expected.begin(), expected.end());
  Make();
  EXPECT_EQ(ListTree(kPhotos), expected);
}

}  // namespace vela_test::hostile
