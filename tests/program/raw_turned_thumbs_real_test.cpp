// A photo's thumbnails that a user has rotated stay rotated when they are made again, with the real
// tools.
#include <optional>

#include "program/real_program_test.h"

namespace vela_test::real {

namespace {

class TurnedThumbs : public RealProgramTest, public ::testing::WithParamInterface<int> {
 protected:
  void SetUp() override {
    RealProgramTest::SetUp();
    InstallRealExiftool();
    daemon_.emplace();
    daemon_->SetIndexVersion(1);
    kinds_ = {{"XL", 120, true, 0}, {"L", 100, true, 1}, {"B", 80, false, 2}};
    WriteKinds(kProfiles, kinds_);
  }

  /// Makes everything, then rotates all thumbnails like a user and sets their times back.
  void MakeAndTurn(const std::string& photo) {
    SetFileTimeFromNow(photo, -3000);
    Make();
    Make();
    ASSERT_TRUE(HasThumbs(photo, kinds_));
    for (const Kind& kind : kinds_) {
      const std::string thumb = ThumbOf(photo, kind);
      Draw({thumb, "-rotate", std::to_string(GetParam()), thumb});
      SetFileTimeFromNow(thumb, -2000);
    }
  }

  /// Touches the photo; every thumbnail is made again and keeps the user's rotation.
  void TouchAndExpectTurn(const std::string& photo) {
    SetFileTimeFromNow(photo, -1000);
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
    EXPECT_THAT(ListDirectory(MetadataDirOf(photo)), SizeIs(kinds_.size()));
    EXPECT_THAT(ErrorLines(), IsEmpty());
    ExpectNothingLeftToMake();
  }

  void ExpectTurnKept(const std::string& photo) {
    MakeAndTurn(photo);
    TouchAndExpectTurn(photo);
  }

  std::optional<DaemonPeer> daemon_;
};

}  // namespace

TEST_P(TurnedThumbs, OfALandscape) {
  ExpectTurnKept(MakeJpeg(InPhotos("a.jpg"), RecipeOf(240, 160)));
}

TEST_P(TurnedThumbs, OfAPortrait) {
  ExpectTurnKept(MakeJpeg(InPhotos("a.jpg"), RecipeOf(160, 240)));
}

TEST_P(TurnedThumbs, OfAPhotoThatIsSavedAgain) {
  JpegRecipe recipe = RecipeOf(240, 160);
  const std::string photo = MakeJpeg(InPhotos("a.jpg"), recipe);
  MakeAndTurn(photo);
  recipe.quality = 50;
  MakeJpeg(photo, recipe);
  TouchAndExpectTurn(photo);
}

TEST_P(TurnedThumbs, OfARawPhotoWithAPreview) {
  ExpectTurnKept(MakeRawPhoto(InPhotos("a.dng"), RawRecipeOf(240, 160)));
}

TEST_P(TurnedThumbs, OfARawPhotoWithoutPreview) {
  ExpectTurnKept(MakeRawPhoto(InPhotos("a.dng"), RawRecipeOf()));
}

INSTANTIATE_TEST_SUITE_P(Degrees, TurnedThumbs, ::testing::Values(0, 90, 180, 270));

}  // namespace vela_test::real
