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

}  // namespace

}  // namespace vela_test::real
