// The single image with a forced rotation.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "profiles/plan_fixture.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

using Words = std::vector<std::string>;

class RotatedThumb : public PlanTest {
 protected:
  void SetUp() override {
    PlanTest::SetUp();
    profile_ = &AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 1, 85, "1x1");
  }

  int Create(int rotate, const std::string& fileName = "Temp_90.jpg") const {
    return CreateRotatedThumb(Job(), rotate, *profile_, kPhoto, fileName, kEaDir);
  }

  const ThumbnailProfile* profile_ = nullptr;
};

TEST_F(RotatedThumb, IsMadeAsItsProfileSays) {
  EXPECT_EQ(Create(90), 0);
  EXPECT_THAT(OnlyCall(Converter()),
              ElementsAreArray(Words{"-define", "registry:temporary-path=/tmp/photo/@eaDir/a.jpg",
                                     kPhoto, "-define", "jpeg:size=320x320", "-thumbnail",
                                     "320x320>^", "-quality", "85", "+profile", "!icc,*",
                                     "-flatten", "-rotate", "90", "-unsharp", "1x1", "-colorspace",
                                     "sRGB", "/tmp/photo/@eaDir/a.jpg/VELAPHOTO.tmp.?.jpg"}));
  EXPECT_THAT(EaFiles(), ElementsAre("Temp_90.jpg"));
}

TEST_F(RotatedThumb, FitsItsBoxWhenItsProfileDoes) {
  const ThumbnailProfile& fitting = AddProfile(640, "VELAPHOTO_THUMB_B.jpg");
  EXPECT_EQ(CreateRotatedThumb(Job(), 180, fitting, kPhoto, "Temp_180.jpg", kEaDir), 0);
  EXPECT_THAT(ValuesOf(OnlyCall(Converter()), "-thumbnail"), ElementsAre("640x640>"));
  EXPECT_THAT(ValuesOf(OnlyCall(Converter()), "-rotate"), ElementsAre("180"));
}

TEST_F(RotatedThumb, ZeroDegreesAreNoRotation) {
  EXPECT_EQ(Create(0, "Temp_0.jpg"), 0);
  EXPECT_THAT(OnlyCall(Converter()), ::testing::Not(::testing::Contains("-rotate")));
  EXPECT_THAT(EaFiles(), ElementsAre("Temp_0.jpg"));
}

TEST_F(RotatedThumb, GoesWhereTheCallerSays) {
  MakeDirectories("/tmp/elsewhere");
  EXPECT_EQ(CreateRotatedThumb(Job(), 90, *profile_, kPhoto, "x", "/tmp/elsewhere"), 0);
  EXPECT_THAT(ListDirectory("/tmp/elsewhere"), ElementsAre("x"));
  EXPECT_THAT(ValuesOf(OnlyCall(Converter()), "-define"),
              ElementsAre("registry:temporary-path=/tmp/elsewhere", "jpeg:size=320x320"));
  EXPECT_THAT(OnlyCall(Converter()).back(), "/tmp/elsewhere/VELAPHOTO.tmp.?");
}

TEST_F(RotatedThumb, IsMadeThoughOneIsThere) {
  MakeThumb("Temp_90.jpg");
  MakeThumb("VELAPHOTO_THUMB_M.jpg");
  EXPECT_EQ(Create(90), 0);
  EXPECT_NE(ReadFile(InEaDir("Temp_90.jpg")), "old thumb");
  EXPECT_EQ(ReadFile(InEaDir("VELAPHOTO_THUMB_M.jpg")), "old thumb");
}

TEST_F(RotatedThumb, AFailureLeavesNoMarker) {
  MakeThumb("VELAPHOTO_THUMB_M.jpg");
  MakeThumb("Temp_90.jpg");
  Converter().Plan(StubPlan().Exit(1));
  EXPECT_EQ(Create(90), -1);
  EXPECT_THAT(EaFiles(), UnorderedElementsAre("VELAPHOTO_THUMB_M.jpg", "Temp_90.jpg"));
}

TEST_F(RotatedThumb, AMissingSourceRunsNothing) {
  RemoveTree(kPhoto);
  EXPECT_EQ(Create(90), -1);
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(EaFiles(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RotatedThumb, ASourceThatIsNoFileIsAFailure) {
  RemoveTree(kPhoto);
  MakeDirectories(kPhoto);
  EXPECT_EQ(Create(90), -1);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_photo_thumb:121 [Error] not a regular file: "
                                        "/tmp/photo/a.jpg"));
}

TEST_F(RotatedThumb, TheDirectoryIsNotMade) {
  Converter().Plan(StubPlan());
  EXPECT_EQ(CreateRotatedThumb(Job(), 90, *profile_, kPhoto, "x.jpg", "/tmp/missing"), -1);
  EXPECT_FALSE(Exists("/tmp/missing"));
}

}  // namespace
}  // namespace vela_test
