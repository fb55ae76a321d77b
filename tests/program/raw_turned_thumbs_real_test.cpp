// A photo whose owner turned its thumbnails keeps them turned when they are made again, with the
// real tools.
#include "program/real_program_test.h"
#include "support/build_paths.h"
#include "support/daemon_peer.h"
#include "support/images.h"
#include "support/raw_photos.h"
#include "support/stub_tool.h"
#include "support/system_log.h"

namespace vela_test::real {

namespace {

class TurnedThumbs : public RealProgramTest, public ::testing::WithParamInterface<int> {
 protected:
  void SetUp() override {
    RealProgramTest::SetUp();
    InstallRealExiftool();
    kinds_ = {{"XL", 120, true, 0}, {"L", 100, true, 1}, {"B", 80, false, 2}};
    WriteKinds(kProfiles, kinds_);
  }

  static void DateBack(const std::string& photo, int seconds) {
    SetFileTimeFromNow(photo, -seconds);
  }

  /// Makes everything; then the owner turns all thumbnails, and that a while ago.
  void MakeAndTurn(const std::string& photo) {
    DateBack(photo, 3000);
    Make();
    Make();
    ASSERT_TRUE(HasThumbs(photo, kinds_));
    for (const Kind& kind : kinds_) {
      const std::string thumb = ThumbOf(photo, kind);
      Draw({thumb, "-rotate", std::to_string(GetParam()), thumb});
      SetFileTimeFromNow(thumb, -2000);
    }
  }

  /// The photo is touched after that; every thumbnail is made anew and stands as its owner wanted.
  void TouchAndExpectTurn(const std::string& photo) {
    DateBack(photo, 1000);
    const auto before = ThumbsBelow(kPhotos);
    Make();
    Make();
    const auto after = ThumbsBelow(kPhotos);
    for (const Kind& kind : kinds_) {
      SCOPED_TRACE(kind.name);
      EXPECT_EQ(QuadrantLetters(ThumbOf(photo, kind)), LettersAfterTurn(GetParam()));
      const std::string path = ThumbOf(photo, kind).substr(std::string(kPhotos).size() + 1);
      ASSERT_EQ(after.count(path), 1U);
      EXPECT_FALSE(before.at(path) == after.at(path)) << "it is the old one";
    }
    EXPECT_EQ(ListDirectory(MetadataOf(photo)).size(), kinds_.size());
    EXPECT_EQ(ErrorLines(), std::vector<std::string>());
    ExpectNothingLeftToMake();
  }

  static std::string PhotoOf(int width, int height, int quality = 95) {
    JpegRecipe recipe;
    recipe.width = width;
    recipe.height = height;
    recipe.quality = quality;
    return MakeJpeg(InPhotos("a.jpg"), recipe);
  }

  static std::string RawPhoto(bool hasPreview) {
    RawRecipe recipe;
    recipe.width = 240;
    recipe.height = 160;
    if (hasPreview) {
      recipe.preview.emplace();
      recipe.preview->width = 240;
      recipe.preview->height = 160;
    }
    return MakeRawPhoto(InPhotos("a.dng"), recipe);
  }
};

}  // namespace

TEST_P(TurnedThumbs, OfALandscape) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(1);
  const std::string photo = PhotoOf(240, 160);
  MakeAndTurn(photo);
  TouchAndExpectTurn(photo);
}

TEST_P(TurnedThumbs, OfAPortrait) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(1);
  const std::string photo = PhotoOf(160, 240);
  MakeAndTurn(photo);
  TouchAndExpectTurn(photo);
}

TEST_P(TurnedThumbs, OfAPhotoThatIsSavedAnew) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(1);
  const std::string photo = PhotoOf(240, 160);
  MakeAndTurn(photo);
  PhotoOf(240, 160, 50);
  TouchAndExpectTurn(photo);
}

TEST_P(TurnedThumbs, OfARawPhotoWithAPreview) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(1);
  const std::string photo = RawPhoto(true);
  MakeAndTurn(photo);
  TouchAndExpectTurn(photo);
}

TEST_P(TurnedThumbs, OfARawPhotoWithoutPreview) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(1);
  const std::string photo = RawPhoto(false);
  MakeAndTurn(photo);
  TouchAndExpectTurn(photo);
}

INSTANTIATE_TEST_SUITE_P(Degrees, TurnedThumbs, ::testing::Values(0, 90, 180, 270));

}  // namespace vela_test::real
