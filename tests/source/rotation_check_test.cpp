// Which trial images are made and what is made of their distances, with recording stubs.
#include <gmock/gmock.h>
#include <stdio.h>

#include <optional>
#include <string>
#include <vector>

#include "source/rotation_check.h"
#include "source/source_fixture.h"
#include "support/images.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::AnyOf;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;

const std::string kReference = InThumbDir("VELAPHOTO_THUMB_XL.jpg");

std::string Trial(int degrees) {
  return InThumbDir("Temp_" + std::to_string(degrees) + ".jpg");
}

std::string Distance(int distance) {
  return std::to_string(distance) + " (0.1)\n";
}

class RotationCheck : public SourceTest {
 protected:
  void SetUp() override {
    SourceTest::SetUp();
    AddProfile(60, "VELAPHOTO_THUMB_M.jpg");
    AddProfile(100, "VELAPHOTO:THUMB_XL.jpg", 77);
    converter_.emplace(kConverterPath);
    compare_.emplace(kComparePath);
    photo_ = "/tmp/photos/a.jpg";
    PutPhoto(64, 48);
    PutReference(32, 24);
  }

  void PutPhoto(int width, int height) const { MakePicture(photo_, width, height); }
  static void PutReference(int width, int height) { MakePicture(kReference, width, height); }

  /// What compare prints for the trial at this turn.
  void PlanDistance(int degrees, const std::string& printed) {
    compare_->PlanWhen(Trial(degrees), StubPlan().PrintError(printed).Exit(1));
  }

  /// The turn that is found; no trial image is left.
  int Turn() const {
    const int degrees = DetectThumbRotation(Job(), photo_, kThumbDir);
    for (const std::string& name : ThumbDirFiles()) {
      EXPECT_NE(name.compare(0, 5, "Temp_"), 0) << name;
    }
    return degrees;
  }
  int TurnAt(int preferred, int preferredDistance, int other, int otherDistance) {
    PlanDistance(preferred, Distance(preferredDistance));
    PlanDistance(other, Distance(otherDistance));
    return Turn();
  }

  void ExpectTrials(const std::vector<int>& degrees) const {
    ArgumentLists expected;
    for (auto i = degrees.rbegin(); i != degrees.rend(); ++i) {
      expected.push_back({"-metric", "MAE", Trial(*i), kReference, "null:"});
    }
    EXPECT_EQ(ParametersOf(compare_->Calls()), expected);
    EXPECT_EQ(converter_->Calls().size(), degrees.size());
  }

  std::string photo_;
  std::optional<StubTool> converter_;
  std::optional<StubTool> compare_;
};

class SameShape : public RotationCheck {};

TEST_F(SameShape, TakesTheCloserOfUprightAndUpsideDown) {
  EXPECT_EQ(TurnAt(0, 5, 180, 6), 0);
  ExpectTrials({0, 180});
  EXPECT_EQ(TurnAt(0, 7, 180, 6), 180);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(SameShape, IsUprightWhenBothAreAsClose) {
  EXPECT_EQ(TurnAt(0, 6, 180, 6), 0);
  EXPECT_EQ(TurnAt(0, 0, 180, 0), 0);
}

TEST_F(SameShape, GoesForPortraitsToo) {
  PutPhoto(48, 64);
  PutReference(24, 32);
  EXPECT_EQ(TurnAt(0, 7, 180, 6), 180);
  ExpectTrials({0, 180});
}

TEST_F(SameShape, IsThatOfAnySquare) {
  for (const std::vector<int>& sizes : std::vector<std::vector<int>>{{48, 48, 24, 32},
                                                                     {48, 48, 32, 24},
                                                                     {48, 48, 24, 24},
                                                                     {64, 48, 24, 24},
                                                                     {48, 64, 24, 24}}) {
    PutPhoto(sizes[0], sizes[1]);
    PutReference(sizes[2], sizes[3]);
    EXPECT_EQ(TurnAt(0, 7, 180, 6), 180);
    EXPECT_EQ(compare_->Calls().back().Parameters()[2], Trial(0));
  }
}

TEST_F(SameShape, IsTakenForWhatCannotBeMeasured) {
  WriteFile(kReference, "no picture");
  EXPECT_EQ(TurnAt(0, 7, 180, 6), 180);
  PutReference(24, 32);
  WriteFile(photo_, "no picture");
  EXPECT_EQ(TurnAt(0, 7, 180, 6), 180);
  EXPECT_EQ(compare_->Calls().size(), 4U);
  EXPECT_EQ(compare_->Calls().back().Parameters()[2], Trial(0));
}

TEST_F(SameShape, IsUprightWhenNothingCanBeCompared) {
  EXPECT_EQ(TurnAt(0, 65535, 180, 65535), 0);
  PlanDistance(0, "");
  PlanDistance(180, "compare:broken\n");
  EXPECT_EQ(Turn(), 0);
  RemoveTool(kComparePath);
  EXPECT_EQ(Turn(), 0);
  const std::string line = "velathumb:152 [Error] VLIBCPopen: /usr/bin/compare -metric MAE ";
  EXPECT_THAT(ErrorLines(), ElementsAre(line + Trial(180) + " " + kReference + " null:",
                                        line + Trial(0) + " " + kReference + " null:"));
}

TEST_F(SameShape, LosesAgainstWhatCanBeMeasured) {
  PlanDistance(0, "");
  PlanDistance(180, Distance(65534));
  EXPECT_EQ(Turn(), 180);
}

class OtherShape : public RotationCheck {
 protected:
  void SetUp() override {
    RotationCheck::SetUp();
    PutReference(24, 32);
  }
};

TEST_F(OtherShape, TakesTheCloserOfBothQuarterTurns) {
  EXPECT_EQ(TurnAt(90, 5, 270, 6), 90);
  ExpectTrials({90, 270});
  EXPECT_EQ(TurnAt(90, 7, 270, 6), 270);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(OtherShape, IsTurnedRightWhenBothAreAsClose) {
  EXPECT_EQ(TurnAt(90, 6, 270, 6), 90);
  EXPECT_EQ(TurnAt(90, 0, 270, 0), 90);
}

TEST_F(OtherShape, GoesForPortraitsToo) {
  PutPhoto(48, 64);
  PutReference(32, 24);
  EXPECT_EQ(TurnAt(90, 7, 270, 6), 270);
  ExpectTrials({90, 270});
}

TEST_F(OtherShape, IsTurnedRightWhenNothingCanBeCompared) {
  EXPECT_EQ(TurnAt(90, 65535, 270, 65535), 90);
  PlanDistance(90, "");
  PlanDistance(270, "");
  EXPECT_EQ(Turn(), 90);
  RemoveTool(kComparePath);
  EXPECT_EQ(Turn(), 90);
  const std::string line = "velathumb:152 [Error] VLIBCPopen: /usr/bin/compare -metric MAE ";
  EXPECT_THAT(ErrorLines(), ElementsAre(line + Trial(270) + " " + kReference + " null:",
                                        line + Trial(90) + " " + kReference + " null:"));
}

TEST_F(OtherShape, NeedsOnePixelOfDifference) {
  PutPhoto(64, 63);
  PutReference(31, 32);
  EXPECT_EQ(TurnAt(90, 6, 270, 5), 270);
}

class TrialImage : public RotationCheck {
 protected:
  /// The only output of a converter call, which is renamed when it is whole.
  static std::string OutputOf(const StubCall& call) { return call.arguments.back(); }

  static std::vector<std::string> WithoutOutput(const StubCall& call) {
    std::vector<std::string> parameters = call.Parameters();
    parameters.pop_back();
    return parameters;
  }
};

TEST_F(TrialImage, IsMadeAsTheReferenceWas) {
  PutReference(24, 32);
  EXPECT_EQ(TurnAt(90, 5, 270, 6), 90);
  const std::vector<StubCall> calls = converter_->Calls();
  ASSERT_EQ(calls.size(), 2U);
  for (size_t i = 0; i < calls.size(); ++i) {
    EXPECT_THAT(WithoutOutput(calls[i]),
                ElementsAre("-define", "registry:temporary-path=" + std::string(kThumbDir), photo_,
                            "-define", "jpeg:size=100x100", "-thumbnail", "100x100>^", "-quality",
                            "77", "+profile", "!icc,*", "-flatten", "-rotate",
                            i == 0 ? "90" : "270", "-colorspace", "sRGB"));
    EXPECT_EQ(OutputOf(calls[i]).compare(0, InThumbDir("VELAPHOTO.tmp.").size(),
                                         InThumbDir("VELAPHOTO.tmp.")),
              0);
  }
}

TEST_F(TrialImage, IsNotTurnedUpright) {
  EXPECT_EQ(TurnAt(0, 5, 180, 6), 0);
  const std::vector<StubCall> calls = converter_->Calls();
  ASSERT_EQ(calls.size(), 2U);
  EXPECT_THAT(calls[0].Parameters(), Not(AnyOf(Contains("-rotate"), Contains("-auto-orient"))));
  EXPECT_THAT(calls[1].Parameters(), AllOf(Contains("-rotate"), Not(Contains("-auto-orient"))));
}

TEST_F(TrialImage, IsNotMadeWithoutAReference) {
  RemoveTree(kReference);
  WriteFile(InThumbDir("VELAPHOTO_THUMB_L.jpg"), "of no profile");
  EXPECT_EQ(Turn(), 0);
  EXPECT_THAT(AllStubCalls(), IsEmpty());
}

TEST_F(TrialImage, IsNotMadeWithoutProfiles) {
  const ThumbnailProfileList none;
  EXPECT_EQ(DetectThumbRotation({"/tmp/photos", none}, photo_, kThumbDir), 0);
  EXPECT_THAT(AllStubCalls(), IsEmpty());
}

TEST_F(TrialImage, ThatCannotBeMadeEndsTheCheck) {
  PlanDistance(0, Distance(7));
  PlanDistance(180, Distance(6));
  converter_->PlanCall(1, StubPlan().Exit(1));
  EXPECT_EQ(Turn(), 0);
  EXPECT_EQ(converter_->Calls().size(), 1U);
  converter_->PlanCall(3, StubPlan().Exit(1));
  EXPECT_EQ(Turn(), 0);
  EXPECT_EQ(converter_->Calls().size(), 3U);
  EXPECT_THAT(compare_->Calls(), IsEmpty());
}

TEST_F(TrialImage, ThatCannotBeMadeGivesNoQuarterTurn) {
  PutReference(24, 32);
  converter_->PlanCall(1, StubPlan().Exit(1));
  EXPECT_EQ(Turn(), 0);
  converter_->PlanCall(3, StubPlan().Exit(1));
  EXPECT_EQ(Turn(), 0);
  EXPECT_EQ(converter_->Calls().size(), 3U);
  EXPECT_THAT(compare_->Calls(), IsEmpty());
}

TEST_F(TrialImage, NeedsTheConverter) {
  RemoveTool(kConverterPath);
  EXPECT_EQ(Turn(), 0);
  EXPECT_THAT(compare_->Calls(), IsEmpty());
}

TEST_F(TrialImage, NeedsThePhoto) {
  RemoveTree(photo_);
  EXPECT_EQ(Turn(), 0);
  EXPECT_THAT(AllStubCalls(), IsEmpty());
}

TEST_F(TrialImage, OfAnEarlierRunIsRemoved) {
  for (const char* name : {"Temp_0.jpg", "Temp_90.jpg", "Temp_270.jpg", "Temp_x.jpg"}) {
    WriteFile(InThumbDir(name), "left");
  }
  WriteFile(InThumbDir("Temp_0.png"), "of somebody else");
  RemoveTree(kReference);
  EXPECT_EQ(DetectThumbRotation(Job(), photo_, kThumbDir), 0);
  EXPECT_THAT(ThumbDirFiles(), ElementsAre("Temp_0.png"));
}

TEST_F(TrialImage, IsRemovedWhateverThePhotoIsCalled) {
  const std::string dir = "/tmp/photos/@eaDir/[a]*?\\.jpg";
  MakeDirectories(dir);
  MakePicture(dir + "/VELAPHOTO_THUMB_XL.jpg", 32, 24);
  EXPECT_EQ(DetectThumbRotation(Job(), photo_, dir), 0);
  EXPECT_EQ(converter_->Calls().size(), 2U);
  EXPECT_THAT(ListDirectory(dir), ElementsAre("VELAPHOTO_THUMB_XL.jpg"));
}

TEST_F(TrialImage, ThatCannotBeRemovedIsLogged) {
  MakeDirectories(Trial(90) + "/in.the.way");
  PlanDistance(0, Distance(7));
  PlanDistance(180, Distance(6));
  EXPECT_EQ(DetectThumbRotation(Job(), photo_, kThumbDir), 180);
  EXPECT_THAT(ThumbDirFiles(), ElementsAre("Temp_90.jpg", "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:334 Failed to remove files by pattern "
                                        "[/tmp/photos/@eaDir/a.dng/Temp_*.jpg]"));
}

class Reference : public RotationCheck {
 protected:
  std::string ReferenceUsed() const {
    const std::vector<StubCall> calls = compare_->Calls();
    return calls.empty() ? "none" : calls.back().Parameters()[3];
  }
  std::string BoxUsed() const { return converter_->Calls().back().Parameters()[6]; }
};

TEST_F(Reference, IsTheLargestThumbnail) {
  MakeJpeg(InThumbDir("VELAPHOTO_THUMB_M.jpg"));
  Turn();
  EXPECT_EQ(ReferenceUsed(), kReference);
  EXPECT_EQ(BoxUsed(), "100x100>^");
}

TEST_F(Reference, IsTheLargestThatIsThere) {
  MakeJpeg(InThumbDir("VELAPHOTO_THUMB_M.jpg"));
  RemoveTree(kReference);
  Turn();
  EXPECT_EQ(ReferenceUsed(), InThumbDir("VELAPHOTO_THUMB_M.jpg"));
  EXPECT_EQ(BoxUsed(), "60x60>^");
}

TEST_F(Reference, MayHaveItsOlderName) {
  const std::string older = InThumbDir("VELAPHOTO:THUMB_XL.jpg");
  ASSERT_EQ(rename(kReference.c_str(), older.c_str()), 0);
  Turn();
  EXPECT_EQ(ReferenceUsed(), older);
}

TEST_F(Reference, IsLeftAsItIs) {
  const std::string before = ReadFile(kReference);
  SetFileTime(kReference, 1600000000);
  Turn();
  EXPECT_EQ(ReadFile(kReference), before);
  EXPECT_EQ(ModificationTime(kReference).seconds, 1600000000);
  EXPECT_THAT(ThumbDirFiles(), ElementsAre("VELAPHOTO_THUMB_XL.jpg"));
}

TEST_F(Reference, GetsItsDirectory) {
  RemoveTree("/tmp/photos/@eaDir/a.dng");
  EXPECT_EQ(Turn(), 0);
  EXPECT_TRUE(IsDirectory(kThumbDir));
}

}  // namespace
}  // namespace vela_test
