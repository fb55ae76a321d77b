// The thumbnails of one photo and one phase, the single image with a forced rotation, and adding a
// setting to a job.
#include <sys/stat.h>

#include <set>

#include "profiles/plan_fixture.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;
using ::testing::UnorderedElementsAreArray;

constexpr const char* kUsualNames[] = {"VELAPHOTO_THUMB_S.jpg", "VELAPHOTO_THUMB_M.jpg",
                                       "VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_XL.jpg"};

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
  EXPECT_EQ(OnlyCall(Converter()),
            WordsOf("-define registry:temporary-path=/tmp/photo/@eaDir/a.jpg /tmp/photo/a.jpg "
                    "-define jpeg:size=320x320 -thumbnail 320x320>^ -quality 85 +profile !icc,* "
                    "-flatten -auto-orient -rotate 90 -unsharp 0.5x0.5+1.25+0.0 -colorspace sRGB "
                    "/tmp/photo/@eaDir/a.jpg/VELAPHOTO.tmp.?.jpg"));
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_M.jpg"));
}

TEST_F(PhotoPlan, LaterPhasesKeepEmbeddedProfiles) {
  AddProfile(640, "VELAPHOTO_THUMB_B.jpg", 1);
  EXPECT_EQ(CreateThumbs(1), 0);
  EXPECT_EQ(OnlyCall(Converter()),
            WordsOf("-define registry:temporary-path=/tmp/photo/@eaDir/a.jpg "
                    "/tmp/photo/a.jpg -define jpeg:size=640x640 -thumbnail 640x640> -quality "
                    "80 -flatten -colorspace sRGB "
                    "/tmp/photo/@eaDir/a.jpg/VELAPHOTO.tmp.?.jpg"));
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

TEST_F(PhotoPlan, FillModesArePlacedByPositionAmongTheMissing) {
  AddUsualProfiles();
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_THAT(ValuesOf(OnlyCall(Converter()), "-thumbnail"),
              ElementsAre("1280x1280>", "640x640>^", "320x320>", "120x120>^"));
  EXPECT_THAT(EaFiles(), UnorderedElementsAreArray(kUsualNames));
  for (const char* name : {kUsualNames[1], kUsualNames[2], kUsualNames[3]}) {
    RemoveTree(InEaDir(name));
  }
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_THAT(ValuesOf(Converter().Calls().back().Parameters(), "-thumbnail"),
              ElementsAre("1280x1280>^", "640x640>", "320x320>^"));
}

TEST_F(PhotoPlan, EveryProfileHasItsOwnQualityAndSharpening) {
  AddProfile(120, "VELAPHOTO_THUMB_S.jpg", 0, 70, "1x1");
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0, 90, "");
  AddProfile(640, "VELAPHOTO_THUMB_B.jpg", 0, 60, "2x2");
  EXPECT_EQ(CreateThumbs(), 0);
  const Words parameters = OnlyCall(Converter());
  EXPECT_THAT(ValuesOf(parameters, "-quality"), ElementsAre("60", "90", "70"));
  EXPECT_THAT(ValuesOf(parameters, "-unsharp"), ElementsAre("2x2", "1x1"));
}

TEST_F(PhotoPlan, OnePhaseIsMadeOrAllOfThem) {
  AddProfile(120, "VELAPHOTO_THUMB_S.jpg", 2);
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0);
  AddProfile(640, "VELAPHOTO_THUMB_B.jpg", 1);
  EXPECT_EQ(CreateThumbs(1), 0);
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_B.jpg"));
  EXPECT_EQ(CreateThumbs(2), 0);
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_S.jpg"));
  RemoveTree(kEaDir);
  EXPECT_EQ(CreateThumbs(-1), 0);
  EXPECT_THAT(EaFiles(), SizeIs(3));
}

TEST_F(PhotoPlan, RotationAndOrientationAreThoseOfTheCaller) {
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0);
  AddProfile(640, "VELAPHOTO_THUMB_B.jpg", 0);
  CreateThumbs(0, false, 270);
  const Words rotated = OnlyCall(Converter());
  EXPECT_THAT(ValuesOf(rotated, "-rotate"), ElementsAre("270", "270"));
  EXPECT_THAT(rotated, Not(Contains("-auto-orient")));
  RemoveTree(kEaDir);
  CreateThumbs(0, true, 0);
  const Words oriented = Converter().Calls().back().Parameters();
  EXPECT_THAT(oriented, Not(Contains("-rotate")));
  EXPECT_THAT(oriented, Contains("-auto-orient"));
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

TEST_F(PhotoPlan, UpToDateThumbsAreNotMade) {
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
  for (const char* name : kUsualNames) {
    MakeThumb(name);
  }
  EXPECT_EQ(CreateThumbs(), 0);
  EXPECT_THAT(Converter().Calls(), IsEmpty());
}

TEST_F(PhotoPlan, APhaseWithoutProfilesStillHasItsDirectory) {
  RemoveTree(kEaDir);
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg", 0);
  EXPECT_EQ(CreateThumbs(1), 0);
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_TRUE(IsDirectory(kEaDir));
  EXPECT_EQ(ModeOf(kEaDir), 0777);
}

TEST_F(PhotoPlan, AMissingPhotoGetsNeitherThumbsNorMarkers) {
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
  MakeThumb("VELAPHOTO_THUMB_B.jpg");  // up to date, but removed with the others
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
}

TEST_F(PhotoPlan, ADirectoryAsPhotoIsAFailedConversion) {
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg");
  RemoveTree(kPhoto);
  MakeDirectories(kPhoto);
  EXPECT_EQ(CreateThumbs(), -1);
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_M.fail"));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_photo_thumb:121 [Error] not a regular file: "
                                            "/tmp/photo/a.jpg"));
}

TEST_F(PhotoPlan, AFailedCommitMarksTheWholePhase) {
  AddUsualProfiles();
  Converter().Plan(StubPlan().WriteOutputs(2).SkipOutputs().WriteOutputs());
  EXPECT_EQ(CreateThumbs(), -1);
  EXPECT_THAT(EaFiles(), UnorderedElementsAre("VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_M.fail",
                                              "VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_XL.fail"));
  EXPECT_THAT(TakeErrorLines(), SizeIs(1));
}

TEST_F(PhotoPlan, AMetadataDirectoryThatCannotBeMadeIsAFailedConversion) {
  AddProfile(320, "VELAPHOTO_THUMB_M.jpg");
  Converter().Plan(StubPlan());
  EXPECT_EQ(CreatePhotoThumbs(Job(), 0, kPhoto, "/tmp/missing/ea", false, false, -1), -1);
  EXPECT_FALSE(Exists("/tmp/missing"));
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_photo_thumb:430 [Error] rename: "
                                            "/tmp/missing/ea/VELAPHOTO.tmp.XXXXXX, "
                                            "/tmp/missing/ea/VELAPHOTO_THUMB_M.jpg"));
}

TEST_F(PhotoPlan, AThumbIsUpToDateAtTheNextCall) {
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

TEST_F(PhotoPlan, OutputsOfOneRunHaveUniqueNames) {
  AddUsualProfiles();
  EXPECT_EQ(CreateThumbs(), 0);
  const Words parameters = Converter().Calls().at(0).Parameters();
  Words outputs = ValuesOf(parameters, "-write");
  outputs.push_back(parameters.back());
  EXPECT_THAT(outputs, SizeIs(4));
  EXPECT_EQ(std::set<std::string>(outputs.begin(), outputs.end()).size(), 4U);
}

class PlannedSetting : public QuietTest {};

TEST_F(PlannedSetting, GetsATemporaryNameAndIsCopied) {
  MakeDirectories("/tmp/out");
  PhotoConvertJob job;
  PhotoThumbSetting setting;
  setting.srcPath = "/tmp/a.jpg";
  setting.destPath = "/tmp/out/thumb.png";
  setting.outDir = "/tmp/out";
  setting.width = 7;
  setting.fillArea = true;
  AddPhotoThumbSetting(job, setting);
  EXPECT_THAT(setting.tempPath,
              ::testing::MatchesRegex("/tmp/out/VELAPHOTO\\.tmp\\.[^./]{6}\\.png"));
  ASSERT_THAT(job.settings, SizeIs(1));
  EXPECT_EQ(job.settings[0].tempPath, setting.tempPath);
  EXPECT_EQ(job.settings[0].destPath, "/tmp/out/thumb.png");
  EXPECT_EQ(job.settings[0].srcPath, "/tmp/a.jpg");
  EXPECT_EQ(job.settings[0].width, 7);
  EXPECT_TRUE(job.settings[0].fillArea);
  setting.destPath = "/tmp/out/other";
  setting.width = 8;
  AddPhotoThumbSetting(job, setting);
  ASSERT_THAT(job.settings, SizeIs(2));
  EXPECT_EQ(job.settings[0].width, 7);
  EXPECT_EQ(job.settings[1].width, 8);
  EXPECT_NE(job.settings[0].tempPath, job.settings[1].tempPath);
  EXPECT_THAT(ListDirectory("/tmp/out"), IsEmpty());
}

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

TEST_F(RotatedThumb, FollowsItsProfile) {
  EXPECT_EQ(Create(90), 0);
  EXPECT_EQ(OnlyCall(Converter()),
            WordsOf("-define registry:temporary-path=/tmp/photo/@eaDir/a.jpg "
                    "/tmp/photo/a.jpg -define jpeg:size=320x320 -thumbnail 320x320>^ "
                    "-quality 85 +profile !icc,* -flatten -rotate 90 -unsharp 1x1 "
                    "-colorspace sRGB /tmp/photo/@eaDir/a.jpg/VELAPHOTO.tmp.?.jpg"));
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

TEST_F(RotatedThumb, IsMadeInTheGivenDirectory) {
  MakeDirectories("/tmp/elsewhere");
  EXPECT_EQ(CreateRotatedThumb(Job(), 90, *profile_, kPhoto, "x", "/tmp/elsewhere"), 0);
  EXPECT_THAT(ListDirectory("/tmp/elsewhere"), ElementsAre("x"));
  EXPECT_THAT(ValuesOf(OnlyCall(Converter()), "-define"),
              ElementsAre("registry:temporary-path=/tmp/elsewhere", "jpeg:size=320x320"));
  EXPECT_THAT(OnlyCall(Converter()).back(), "/tmp/elsewhere/VELAPHOTO.tmp.?");
}

TEST_F(RotatedThumb, IsMadeEvenIfOneExists) {
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
}

TEST_F(RotatedThumb, ADirectoryAsSourceIsAFailure) {
  RemoveTree(kPhoto);
  MakeDirectories(kPhoto);
  EXPECT_EQ(Create(90), -1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_photo_thumb:121 [Error] not a regular file: "
                                            "/tmp/photo/a.jpg"));
}

TEST_F(RotatedThumb, TheDirectoryIsNotMade) {
  Converter().Plan(StubPlan());
  EXPECT_EQ(CreateRotatedThumb(Job(), 90, *profile_, kPhoto, "x.jpg", "/tmp/missing"), -1);
  EXPECT_FALSE(Exists("/tmp/missing"));
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_photo_thumb:430 [Error] rename: "
                          "/tmp/missing/VELAPHOTO.tmp.XXXXXX, /tmp/missing/x.jpg"));
}

}  // namespace
}  // namespace vela_test
