// The thumbnails of one photo and one phase.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <set>
#include <string>
#include <vector>

#include "profiles/plan_fixture.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;

using Words = std::vector<std::string>;

class PhotoPlan : public PlanTest {
 protected:
  void AddUsualProfiles(int phase = 0) {
    AddProfile(120, "VELAPHOTO_THUMB_S.jpg", phase);
    AddProfile(320, "VELAPHOTO_THUMB_M.jpg", phase);
    AddProfile(640, "VELAPHOTO_THUMB_B.jpg", phase);
    AddProfile(1280, "VELAPHOTO_THUMB_XL.jpg", phase);
  }
};

TEST_F(PhotoPlan, OneThumb) {
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0, 85, "0.5x0.5+1.25+0.0");
  EXPECT_EQ(CreateThumbs(0, true, 90), 0);
  EXPECT_THAT(OnlyCall(Converter()),
              ElementsAreArray(Words{"-define",
                                     "registry:temporary-path=/tmp/photo/@eaDir/a.jpg",
                                     kPhoto,
                                     "-define",
                                     "jpeg:size=320x320",
                                     "-thumbnail",
                                     "320x320>^",
                                     "-quality",
                                     "85",
                                     "+profile",
                                     "!icc,*",
                                     "-flatten",
                                     "-auto-orient",
                                     "-rotate",
                                     "90",
                                     "-unsharp",
                                     "0.5x0.5+1.25+0.0",
                                     "-colorspace",
                                     "sRGB",
                                     "/tmp/photo/@eaDir/a.jpg/VELAPHOTO.tmp.?.jpg"}));
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_M.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PhotoPlan, LaterPhasesKeepEmbeddedProfiles) {
  AddProfile(640, "VELAPHOTO_THUMB_B.jpg", 1);
  EXPECT_EQ(CreateThumbs(1), 0);
  EXPECT_THAT(OnlyCall(Converter()),
              ElementsAreArray(Words{"-define", "registry:temporary-path=/tmp/photo/@eaDir/a.jpg",
                                     kPhoto, "-define", "jpeg:size=640x640", "-thumbnail",
                                     "640x640>", "-quality", "80", "-flatten", "-colorspace",
                                     "sRGB", "/tmp/photo/@eaDir/a.jpg/VELAPHOTO.tmp.?.jpg"}));
}

TEST_F(PhotoPlan, OnlyPhaseZeroStripsEmbeddedProfiles) {
  for (const int phase : {0, 1, 2, -1}) {
    AddProfile(120 + phase, "VELAPHOTO_THUMB_S.jpg", phase);
    RemoveTree(kEaDir);
    CreateThumbs(phase);
    const Words parameters = Converter().Calls().back().Parameters();
    EXPECT_EQ(ValuesOf(parameters, "+profile").empty(), phase != 0) << phase;
  }
}

TEST_F(PhotoPlan, FillModesStayAtTheirPositionsWhenTheSizesAreSorted) {
  AddUsualProfiles();
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_THAT(ValuesOf(OnlyCall(Converter()), "-thumbnail"),
              ElementsAre("1280x1280>", "640x640>^", "320x320>", "120x120>^"));
  EXPECT_THAT(EaFiles(), UnorderedElementsAre("VELAPHOTO_THUMB_S.jpg", "VELAPHOTO_THUMB_M.jpg",
                                              "VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_XL.jpg"));
}

TEST_F(PhotoPlan, FillModesArePlacedByWhatIsMissing) {
  AddUsualProfiles();
  MakeThumb("VELAPHOTO_THUMB_S.jpg");
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_THAT(ValuesOf(OnlyCall(Converter()), "-thumbnail"),
              ElementsAre("1280x1280>^", "640x640>", "320x320>^"));
}

TEST_F(PhotoPlan, EveryProfileKeepsItsOwnQualityAndSharpening) {
  AddProfile(120, "VELAPHOTO_THUMB_S.jpg", 0, 70, "1x1");
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0, 90, "");
  AddProfile(640, "VELAPHOTO_THUMB_B.jpg", 0, 60, "2x2");
  EXPECT_EQ(CreateThumbs(), 0);
  const Words parameters = OnlyCall(Converter());
  EXPECT_THAT(ValuesOf(parameters, "-quality"), ElementsAre("60", "90", "70"));
  EXPECT_THAT(ValuesOf(parameters, "-unsharp"), ElementsAre("2x2", "1x1"));
}

TEST_F(PhotoPlan, OnlyThePhaseAskedForIsMade) {
  AddProfile(120, "VELAPHOTO_THUMB_S.jpg", 2);
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0);
  AddProfile(640, "VELAPHOTO_THUMB_B.jpg", 1);
  EXPECT_EQ(CreateThumbs(1), 0);
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_B.jpg"));
  EXPECT_EQ(CreateThumbs(2), 0);
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_S.jpg"));
}

TEST_F(PhotoPlan, AnyOtherPhaseIsAllOfThem) {
  AddProfile(120, "VELAPHOTO_THUMB_S.jpg", 2);
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0);
  AddProfile(640, "VELAPHOTO_THUMB_B.jpg", 1);
  EXPECT_EQ(CreateThumbs(-1), 0);
  EXPECT_THAT(EaFiles(), SizeIs(3));
}

TEST_F(PhotoPlan, RotationAndOrientationAreTheCallers) {
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0);
  AddProfile(640, "VELAPHOTO_THUMB_B.jpg", 0);
  CreateThumbs(0, false, 270);
  EXPECT_THAT(ValuesOf(OnlyCall(Converter()), "-rotate"), ElementsAre("270", "270"));
  EXPECT_THAT(OnlyCall(Converter()), Not(Contains("-auto-orient")));
}

TEST_F(PhotoPlan, NoRotationIsPassedForZero) {
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0);
  CreateThumbs(0, true, 0);
  EXPECT_THAT(OnlyCall(Converter()), Not(Contains("-rotate")));
  EXPECT_THAT(OnlyCall(Converter()), Contains("-auto-orient"));
}

TEST_F(PhotoPlan, TheIgnoredFlagIsIgnored) {
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0);
  EXPECT_EQ(CreatePhotoThumbs(Job(), 0, kPhoto, kEaDir, true, false, 90), 0);
  RemoveTree(kEaDir);
  EXPECT_EQ(CreatePhotoThumbs(Job(), 0, kPhoto, kEaDir, true, true, 90), 0);
  const std::vector<StubCall> calls = Converter().Calls();
  ASSERT_THAT(calls, SizeIs(2));
  EXPECT_EQ(WithoutRandomNames(calls[0].Parameters()), WithoutRandomNames(calls[1].Parameters()));
}

TEST_F(PhotoPlan, ColonNamesAreWrittenWithUnderscores) {
  AddProfile(320, "VELAPHOTO:THUMB_M.jpg");
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_M.jpg"));
}

TEST_F(PhotoPlan, AThumbOfTheConfiguredOlderNameIsEnough) {
  AddProfile(320, "VELAPHOTO:THUMB_M.jpg");
  MakeThumb("VELAPHOTO:THUMB_M.jpg");
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO:THUMB_M.jpg"));
}

TEST_F(PhotoPlan, WhatIsUpToDateIsNotMade) {
  AddUsualProfiles();
  MakeThumb("VELAPHOTO_THUMB_XL.jpg");
  MakeThumb("VELAPHOTO_THUMB_B.jpg", "old thumb", 0);
  MakeThumb("VELAPHOTO_THUMB_M.jpg", "");
  MakeThumb("VELAPHOTO_THUMB_S.jpg", "old thumb", -1);
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_THAT(ValuesOf(OnlyCall(Converter()), "-thumbnail"), SizeIs(2));
  EXPECT_EQ(ReadFile(InEaDir("VELAPHOTO_THUMB_XL.jpg")), "old thumb");
  EXPECT_EQ(ReadFile(InEaDir("VELAPHOTO_THUMB_B.jpg")), "old thumb");
  EXPECT_GT(FileSize(InEaDir("VELAPHOTO_THUMB_M.jpg")), 100);
  EXPECT_GT(FileSize(InEaDir("VELAPHOTO_THUMB_S.jpg")), 100);
}

TEST_F(PhotoPlan, NothingIsRunWhenEverythingIsUpToDate) {
  AddUsualProfiles();
  for (const char* name : {"VELAPHOTO_THUMB_S.jpg", "VELAPHOTO_THUMB_M.jpg",
                           "VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_XL.jpg"}) {
    MakeThumb(name);
  }
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PhotoPlan, APhaseWithoutProfilesStillHasItsDirectory) {
  RemoveTree(kEaDir);
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0);
  EXPECT_EQ(CreateThumbs(1), 0);
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_TRUE(IsDirectory(kEaDir));
  EXPECT_EQ(ModeOf(kEaDir), 0777);
}

TEST_F(PhotoPlan, AMissingPhotoIsNothingToMarkOrMake) {
  AddUsualProfiles();
  MakeThumb("VELAPHOTO_THUMB_M.jpg");
  MakeThumb("VELAPHOTO_THUMB_S.fail", "");
  RemoveTree(kPhoto);
  EXPECT_EQ(CreateThumbs(), -1);
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_S.fail"));
  RemoveTree("/tmp/photo/@eaDir");
  EXPECT_EQ(CreateThumbs(), -1);
  EXPECT_FALSE(Exists("/tmp/photo/@eaDir"));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PhotoPlan, AFailedConversionMarksTheWholePhaseAndNoOther) {
  AddProfile(120, "VELAPHOTO_THUMB_S.jpg", 2);
  AddProfile(240, "VELAPHOTO:THUMB_SM.jpg", 1);
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0);
  AddProfile(640, "VELAPHOTO_THUMB_B.jpg", 1);
  AddProfile(800, "VELAPHOTO_THUMB_L.jpg", 1);
  MakeThumb("VELAPHOTO_THUMB_M.jpg");
  MakeThumb("VELAPHOTO_THUMB_S.jpg");
  MakeThumb("VELAPHOTO:THUMB_SM.jpg");
  MakeThumb("VELAPHOTO_THUMB_B.jpg");  // up to date, and gone with the others
  Converter().Plan(StubPlan().Exit(1));
  EXPECT_EQ(CreateThumbs(1), -1);
  EXPECT_THAT(EaFiles(), UnorderedElementsAre("VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_S.jpg",
                                              "VELAPHOTO_THUMB_SM.fail", "VELAPHOTO_THUMB_B.fail",
                                              "VELAPHOTO_THUMB_L.fail"));
  for (const char* marker :
       {"VELAPHOTO_THUMB_SM.fail", "VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_L.fail"}) {
    EXPECT_EQ(FileSize(InEaDir(marker)), 0);
    EXPECT_EQ(ModeOf(InEaDir(marker)), 0777);
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PhotoPlan, APhotoThatIsNoFileIsAFailedConversion) {
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg");
  RemoveTree(kPhoto);
  MakeDirectories(kPhoto);
  EXPECT_EQ(CreateThumbs(), -1);
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_M.fail"));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_photo_thumb:121 [Error] not a regular file: "
                                        "/tmp/photo/a.jpg"));
}

TEST_F(PhotoPlan, AFailedCommitMarksTheWholePhase) {
  AddUsualProfiles();
  Converter().Plan(StubPlan().WriteOutputs(2).SkipOutputs().WriteOutputs());
  EXPECT_EQ(CreateThumbs(), -1);
  EXPECT_THAT(EaFiles(), UnorderedElementsAre("VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_M.fail",
                                              "VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_XL.fail"));
  EXPECT_THAT(ErrorLines(), SizeIs(1));
}

TEST_F(PhotoPlan, AMetadataDirectoryThatCannotBeMadeIsAFailedConversion) {
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg");
  Converter().Plan(StubPlan());
  EXPECT_EQ(CreatePhotoThumbs(Job(), 0, kPhoto, "/tmp/missing/ea", false, false, -1), -1);
  EXPECT_FALSE(Exists("/tmp/missing"));
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_photo_thumb:430 [Error] rename: "
                                        "/tmp/missing/ea/VELAPHOTO.tmp.XXXXXX, "
                                        "/tmp/missing/ea/VELAPHOTO_THUMB_M.jpg"));
}

TEST_F(PhotoPlan, AMadeThumbIsUpToDateAtTheNextCall) {
  AddUsualProfiles();
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_THAT(Converter().Calls(), SizeIs(1));
}

TEST_F(PhotoPlan, TwoProfilesOfOneThumbAreBothMade) {
  AddProfile(300, "VELAPHOTO:THUMB_M.jpg");
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg");
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_THAT(ValuesOf(OnlyCall(Converter()), "-thumbnail"), ElementsAre("320x320>^", "300x300>^"));
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_M.jpg"));
}

TEST_F(PhotoPlan, OutputsOfOneRunHaveNamesOfTheirOwn) {
  AddUsualProfiles();
  EXPECT_EQ(CreateThumbs(), 0);
  const Words parameters = Converter().Calls().at(0).Parameters();
  Words outputs = ValuesOf(parameters, "-write");
  outputs.push_back(parameters.back());
  EXPECT_THAT(outputs, SizeIs(4));
  EXPECT_EQ(std::set<std::string>(outputs.begin(), outputs.end()).size(), 4U);
}

}  // namespace
}  // namespace vela_test
