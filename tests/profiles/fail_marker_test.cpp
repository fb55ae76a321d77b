// Failure markers.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <string>

#include "profiles/plan_fixture.h"
#include "support/mounts.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

constexpr const char* kCurrent = "VELAPHOTO_THUMB_M.jpg";
constexpr const char* kCurrentMarker = "VELAPHOTO_THUMB_M.fail";
constexpr const char* kOlder = "VELAPHOTO:THUMB_M.jpg";
constexpr const char* kOlderMarker = "VELAPHOTO:THUMB_M.fail";

class FailMarker : public PlanTest {
 protected:
  void SetUp() override {
    PlanTest::SetUp();
    colon_ = &AddProfile(320, kOlder);
    underscore_ = &AddProfile(320, kCurrent);
  }

  static void MakeEverything() {
    for (const char* name : {kCurrent, kCurrentMarker, kOlder, kOlderMarker,
                             "VELAPHOTO_THUMB_S.jpg", "VELAPHOTO_THUMB_S.fail"}) {
      MakeThumb(name);
    }
  }

  const ThumbnailProfile* colon_ = nullptr;
  const ThumbnailProfile* underscore_ = nullptr;
};

TEST_F(FailMarker, RemovalTakesThumbAndMarkerUnderBothNames) {
  MakeEverything();
  RemoveThumbAndFailMarker(*colon_, kEaDir);
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_S.jpg"));
}

TEST_F(FailMarker, RemovalKeepsTheOlderNameOfAProfileThatDoesNotNameIt) {
  MakeEverything();
  RemoveThumbAndFailMarker(*underscore_, kEaDir);
  EXPECT_THAT(EaFiles(), UnorderedElementsAre(kOlder, kOlderMarker, "VELAPHOTO_THUMB_S.fail",
                                              "VELAPHOTO_THUMB_S.jpg"));
}

TEST_F(FailMarker, RemovalIgnoresErrors) {
  MakeThumb(kCurrent);
  MakeThumb(kOlderMarker);
  MakeDirectories(InEaDir(kOlder));  // cannot be removed like a file
  RemoveThumbAndFailMarker(*colon_, kEaDir);
  EXPECT_THAT(EaFiles(), ElementsAre(kOlder));
  RemoveThumbAndFailMarker(*colon_, kEaDir);
  RemoveThumbAndFailMarker(*colon_, "/tmp/missing");
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(FailMarker, ReplacesTheThumb) {
  MakeEverything();
  CreateThumbFailMarker(*colon_, kEaDir);
  EXPECT_THAT(EaFiles(),
              ElementsAre(kCurrentMarker, "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_S.jpg"));
  EXPECT_EQ(FileSize(InEaDir(kCurrentMarker)), 0);
  EXPECT_EQ(ModeOf(InEaDir(kCurrentMarker)), 0777);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(FailMarker, TheMaskAppliesToItsMode) {
  umask(027);
  CreateThumbFailMarker(*colon_, kEaDir);
  EXPECT_EQ(ModeOf(InEaDir(kCurrentMarker)), 0750);
}

TEST_F(FailMarker, TheLastDotBeginsTheExtension) {
  AddProfile(1, "a.b.c");
  CreateThumbFailMarker(AddProfile(1, "a.b.c"), kEaDir);
  EXPECT_THAT(EaFiles(), ElementsAre("a.b.fail"));
}

TEST_F(FailMarker, ATargetThatCannotBeMadeIsIgnored) {
  CreateThumbFailMarker(*colon_, "/tmp/missing");
  EXPECT_FALSE(Exists("/tmp/missing"));
  MakeThumb(kCurrent);
  {
    const ReadOnlyMount readOnly("/tmp/photo");
    CreateThumbFailMarker(*colon_, kEaDir);
  }
  EXPECT_THAT(EaFiles(), ElementsAre(kCurrent));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(FailMarker, APathWithoutDotHasNone) {
  const std::string eaDir = "/tmp/plain";
  MakeDirectories(eaDir);
  WriteFile(eaDir + "/name", "thumb");
  CreateThumbFailMarker(AddProfile(1, "name"), eaDir);
  EXPECT_THAT(ListDirectory(eaDir), IsEmpty());
}

TEST_F(FailMarker, AWholePhaseIsMarkedAtOnce) {
  AddProfile(640, "VELAPHOTO:THUMB_B.jpg", 1);
  AddProfile(800, "VELAPHOTO_THUMB_L.jpg", 1);
  AddProfile(1280, "VELAPHOTO_THUMB_XL.jpg", 2);
  MakeEverything();
  MakeThumb("VELAPHOTO:THUMB_B.jpg");
  EXPECT_EQ(CreatePhaseFailMarkers(Job(), 1, kEaDir), 2);
  EXPECT_THAT(EaFiles(), UnorderedElementsAre(kCurrent, kCurrentMarker, kOlder, kOlderMarker,
                                              "VELAPHOTO_THUMB_S.jpg", "VELAPHOTO_THUMB_S.fail",
                                              "VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_L.fail"));
  EXPECT_EQ(CreatePhaseFailMarkers(Job(), 2, kEaDir), 1);
  EXPECT_TRUE(Exists(InEaDir("VELAPHOTO_THUMB_XL.fail")));
}

}  // namespace
}  // namespace vela_test
