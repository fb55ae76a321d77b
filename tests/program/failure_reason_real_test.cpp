// The reason why a photo has failed, in the system log.
#include "program/real_program_test.h"

namespace vela_test::real {

namespace {

using FailureReason = RealProgramTest;

TEST_F(FailureReason, IsLoggedOnceForEachPhoto) {
  const DaemonPeer daemon;
  WriteFile(InPhotos("a.jpg"), "no photo");
  const std::string bitmap = MakeImage(InPhotos("b.bmp"), 240, 160);
  WriteFile(bitmap, ReadFile(bitmap).substr(0, 1000));
  WriteFile(InPhotos("c.nef"), "no photo");
  const std::string good = MakeJpeg(InPhotos("d.jpg"));
  Make();
  EXPECT_EQ(ErrorLines(),
            (Strings{
                "convert-thumb: " + InPhotos("a.jpg") + ": not a photo in a known format",
                "convert-thumb: " + InPhotos("b.bmp") + ": ImageMagick: improper image header",
                "velathumb:660 Failed to convert raw " + InPhotos("c.nef") + " to pnm",
            }));
  EXPECT_TRUE(IsMarkedFailed(InPhotos("a.jpg"), kinds_));
  EXPECT_TRUE(HasThumbs(good, OfPhase(kinds_, 0)));
}

/// All files of photos that are neither thumbnails nor failure markers.
Strings OtherFilesOf(const std::string& photo) {
  Strings others;
  for (const std::string& name : ListDirectory(MetadataDirOf(photo))) {
    if (name.compare(0, 16, "VELAPHOTO_THUMB_") != 0) {
      others.push_back(name);
    }
  }
  return others;
}

TEST_F(FailureReason, IsLoggedForAnOptionOfTheProfileAndNothingIsLeftBehind) {
  constexpr int kPasses = 5;
  const DaemonPeer daemon;
  WriteProfileFile(kProfiles, {{"thumb_XL", 100, 90, "foo", "VELAPHOTO_THUMB_XL.jpg", 0}});
  const std::string photo = MakeJpeg(InPhotos("a.jpg"));
  const Kind kind = {"XL", 100, false, 0};
  for (int pass = 0; pass < kPasses; ++pass) {
    Make();
    EXPECT_TRUE(IsMarkedFailed(photo, {kind}));
    EXPECT_THAT(OtherFilesOf(photo), IsEmpty());
    RemoveTree(MarkerOf(photo, kind));
  }
  EXPECT_THAT(
      ErrorLines(),
      ::testing::AllOf(SizeIs(kPasses),
                       ::testing::Each(::testing::StartsWith("convert-thumb: " + photo + ": "))));
}

}  // namespace

}  // namespace vela_test::real
