// The rotation of thumbnails is recognised from the photo alone, with the real tools.

#include "profiles/photo_thumb_plan.h"
#include "source/raw_image.h"
#include "source/rotation_check.h"
#include "source/source_fixture.h"
#include "support/build_paths.h"
#include "support/program.h"

using namespace vela;

namespace vela_test {
namespace {

class RealTurn : public SourceTest {
 protected:
  void SetUp() override {
    SourceTest::SetUp();
    InstallRealTools();
    AddProfile(60, "VELAPHOTO_THUMB_M.jpg", 75);
    AddProfile(100, "VELAPHOTO:THUMB_XL.jpg");
  }

  static void PutPhoto(int width, int height, int quality = 95) {
    JpegRecipe recipe;
    recipe.width = width;
    recipe.height = height;
    recipe.quality = quality;
    MakeJpeg(kPhoto, recipe);
  }

  /// Makes thumbnails that a user has rotated.
  void PutThumbs(int degrees, const std::string& source = kPhoto) const {
    RemoveTree(kThumbDir);
    ASSERT_EQ(CreatePhotoThumbs(Job(), 0, source, kThumbDir, false, false, degrees), 0);
  }

  void ExpectRecognised(const std::string& photo = kPhoto) const {
    const std::vector<std::string> before = ThumbDirFiles();
    EXPECT_EQ(DetectThumbRotation(Job(), photo, kThumbDir), degrees_);
    EXPECT_EQ(ThumbDirFiles(), before);
    EXPECT_THAT(ErrorLines(), IsEmpty());
  }

  int degrees_ = 0;
};

class EachTurn : public RealTurn, public ::testing::WithParamInterface<int> {
 protected:
  void SetUp() override {
    RealTurn::SetUp();
    degrees_ = GetParam();
  }
};

TEST_P(EachTurn, OfALandscape) {
  PutPhoto(240, 160);
  PutThumbs(degrees_);
  EXPECT_EQ(QuadrantLetters(InThumbDir("VELAPHOTO_THUMB_XL.jpg")), LettersAfterTurn(degrees_));
  ExpectRecognised();
}

TEST_P(EachTurn, OfAPortrait) {
  PutPhoto(160, 240);
  PutThumbs(degrees_);
  ExpectRecognised();
}

TEST_P(EachTurn, OfAPhotoThatWasSavedAgain) {
  PutPhoto(240, 160);
  PutThumbs(degrees_);
  PutPhoto(240, 160, 40);
  ExpectRecognised();
}

TEST_P(EachTurn, OfThumbnailsOfTheirOlderNames) {
  PutPhoto(240, 160);
  PutThumbs(degrees_);
  ASSERT_EQ(rename(InThumbDir("VELAPHOTO_THUMB_XL.jpg").c_str(),
                   InThumbDir("VELAPHOTO:THUMB_XL.jpg").c_str()),
            0);
  ExpectRecognised();
}

TEST_P(EachTurn, ByASmallThumbnailAlone) {
  PutPhoto(160, 240);
  const ThumbnailProfile small(60, 75, "", "VELAPHOTO_THUMB_M.jpg", 0);
  ASSERT_EQ(CreateRotatedThumb(Job(), degrees_, small, kPhoto, small.filename(), kThumbDir), 0);
  ExpectRecognised();
}

TEST_P(EachTurn, IsDoneTwiceToThumbnailsBelowTheLargestOfARun) {
  // They are made from the largest one, which is already turned, and are turned once more. The
  // check uses the largest one.
  PutPhoto(240, 160);
  PutThumbs(degrees_);
  EXPECT_EQ(QuadrantLetters(InThumbDir("VELAPHOTO_THUMB_M.jpg")),
            LettersAfterTurn(2 * degrees_ % 360));
  ExpectRecognised();
}

TEST_P(EachTurn, OfARawPhotosFullDecode) {
  RawRecipe recipe;
  recipe.width = 160;
  recipe.height = 120;
  MakeRawPhoto(kRaw, recipe);
  const std::string decoded = "/tmp/photos/RAW_TEMP.ppm";
  ASSERT_TRUE(DcrawToFile(kRaw, decoded, "-w"));
  PutThumbs(degrees_, decoded);
  ExpectRecognised(decoded);
}

// A real camera picture, if the machine has one.
TEST_P(EachTurn, OfACameraPhotoSavedAgain) {
  const std::string camera = SharedMediaDirectory() + "/no_exif.jpg";
  if (IsRegularFile(camera)) {
    CopyFile(camera, kPhoto);
  } else {
    PutPhoto(320, 240);
  }
  PutThumbs(degrees_);
  const ProgramResult saved =
      RunProgram(kConverterPath, {kPhoto, "-strip", "-quality", "50", kPhoto});
  ASSERT_EQ(saved.exitCode, 0) << saved.err;
  ExpectRecognised();
}

INSTANTIATE_TEST_SUITE_P(Degrees, EachTurn, ::testing::Values(0, 90, 180, 270));

TEST_F(RealTurn, OfASquareIsUprightOrUpsideDown) {
  PutPhoto(200, 200);
  for (const int degrees : {0, 180}) {
    PutThumbs(degrees);
    degrees_ = degrees;
    ExpectRecognised();
  }
}

TEST_F(RealTurn, OfASquareIsNeverAQuarterTurn) {
  PutPhoto(200, 200);
  for (const int degrees : {90, 270}) {
    PutThumbs(degrees);
    const int found = DetectThumbRotation(Job(), kPhoto, kThumbDir);
    EXPECT_TRUE(found == 0 || found == 180) << found;
  }
}

TEST_F(RealTurn, IsZeroForAnUnreadableReference) {
  PutPhoto(240, 160);
  for (const char* content : {"", "no picture"}) {
    WriteFile(InThumbDir("VELAPHOTO_THUMB_XL.jpg"), content);
    ExpectRecognised();
  }
}

TEST_F(RealTurn, IsZeroForAnUnreadablePhoto) {
  PutPhoto(240, 160);
  PutThumbs(180);
  WriteFile(kPhoto, "no picture");
  EXPECT_EQ(DetectThumbRotation(Job(), kPhoto, kThumbDir), 0);
  EXPECT_THAT(ThumbDirFiles(), ElementsAre("VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_XL.jpg"));
}

TEST_F(RealTurn, IsUnknownWithoutCompare) {
  RemoveTool(kComparePath);
  PutPhoto(240, 160);
  PutThumbs(180);
  EXPECT_EQ(DetectThumbRotation(Job(), kPhoto, kThumbDir), 0);
  PutThumbs(270);
  EXPECT_EQ(DetectThumbRotation(Job(), kPhoto, kThumbDir), 90);
  EXPECT_THAT(ThumbDirFiles(), ElementsAre("VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_XL.jpg"));
}

TEST_F(RealTurn, OfAPlainPictureIsAmbiguous) {
  WriteFile("/tmp/plain.pgm", "P5\n240 160\n255\n" + std::string(240 * 160, '\x80'));
  const ProgramResult drawn = RunProgram(kConverterPath, {"/tmp/plain.pgm", kPhoto});
  ASSERT_EQ(drawn.exitCode, 0) << drawn.err;
  PutThumbs(180);
  EXPECT_EQ(DetectThumbRotation(Job(), kPhoto, kThumbDir), 0);
  PutThumbs(270);
  EXPECT_EQ(DetectThumbRotation(Job(), kPhoto, kThumbDir), 90);
}

}  // namespace
}  // namespace vela_test
