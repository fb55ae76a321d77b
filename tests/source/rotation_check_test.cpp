// Which trial images are made and how their distances are used, with recording stubs.
#include <stdio.h>

#include "source/rotation_check.h"
#include "source/source_fixture.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::AnyOf;
using ::testing::Contains;
using ::testing::Not;
using ::testing::StartsWith;

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
    PutPhoto(64, 48);
    PutReference(32, 24);
  }

  static void PutPhoto(int width, int height) { MakePicture(kPhoto, width, height); }
  static void PutReference(int width, int height) { MakePicture(kReference, width, height); }

  /// Sets the output of compare for the trial at this turn.
  void PlanDistance(int degrees, const std::string& printed) {
    compare_->PlanWhen(Trial(degrees), StubPlan().PrintError(printed).Exit(1));
  }

  /// The detected turn; expects that no trial image is left.
  int Turn() const {
    const int degrees = DetectThumbRotation(Job(), kPhoto, kThumbDir);
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

  std::optional<StubTool> converter_;
  std::optional<StubTool> compare_;
};

/// Two turns that are possible for a reference of this size, of which the first one is preferred.
struct Shape : NamedCase {
  int width;
  int height;
  int preferred;
  int other;
};

class EachShape : public RotationCheck, public ::testing::WithParamInterface<Shape> {
 protected:
  void SetUp() override {
    RotationCheck::SetUp();
    PutReference(GetParam().width, GetParam().height);
  }

  const int preferred_ = GetParam().preferred;
  const int other_ = GetParam().other;
};

INSTANTIATE_TEST_SUITE_P(Shapes, EachShape,
                         ::testing::Values(Shape{"ThatOfThePhoto", 32, 24, 0, 180},
                                           Shape{"TheOther", 24, 32, 90, 270}),
                         CaseName());

TEST_P(EachShape, TakesTheCloserTurn) {
  EXPECT_EQ(TurnAt(preferred_, 5, other_, 6), preferred_);
  ExpectTrials({preferred_, other_});
  EXPECT_EQ(TurnAt(preferred_, 7, other_, 6), other_);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_P(EachShape, TakesThePreferredTurnWhenBothAreAsClose) {
  EXPECT_EQ(TurnAt(preferred_, 6, other_, 6), preferred_);
  EXPECT_EQ(TurnAt(preferred_, 0, other_, 0), preferred_);
}

TEST_P(EachShape, WorksForPortraits) {
  PutPhoto(48, 64);
  PutReference(GetParam().height, GetParam().width);
  EXPECT_EQ(TurnAt(preferred_, 7, other_, 6), other_);
  ExpectTrials({preferred_, other_});
}

TEST_P(EachShape, TakesThePreferredTurnWhenNothingCanBeCompared) {
  EXPECT_EQ(TurnAt(preferred_, 65535, other_, 65535), preferred_);
  PlanDistance(preferred_, "");
  for (const char* printed : {"", "compare:broken\n"}) {
    PlanDistance(other_, printed);
    EXPECT_EQ(Turn(), preferred_);
  }
  RemoveTool(kComparePath);
  EXPECT_EQ(Turn(), preferred_);
  const std::string line = "velathumb:152 [Error] VLIBCPopen: /usr/bin/compare -metric MAE ";
  EXPECT_THAT(ErrorLines(), ElementsAre(line + Trial(other_) + " " + kReference + " null:",
                                        line + Trial(preferred_) + " " + kReference + " null:"));
}

TEST_P(EachShape, IsNotTurnedWhenATrialImageCannotBeMade) {
  PlanDistance(preferred_, Distance(7));
  PlanDistance(other_, Distance(6));
  converter_->PlanCall(1, StubPlan().Exit(1));
  EXPECT_EQ(Turn(), 0);
  EXPECT_THAT(converter_->Calls(), SizeIs(1));
  converter_->PlanCall(3, StubPlan().Exit(1));
  EXPECT_EQ(Turn(), 0);
  EXPECT_THAT(converter_->Calls(), SizeIs(3));
  EXPECT_THAT(compare_->Calls(), IsEmpty());
}

using SameShape = RotationCheck;

/// Sizes of a photo and its reference of which at least one is a square.
struct Sizes {
  int photoWidth;
  int photoHeight;
  int width;
  int height;
};

TEST_F(SameShape, IsThatOfAnySquare) {
  for (const Sizes& sizes : {Sizes{48, 48, 24, 32}, Sizes{48, 48, 32, 24}, Sizes{48, 48, 24, 24},
                             Sizes{64, 48, 24, 24}, Sizes{48, 64, 24, 24}}) {
    PutPhoto(sizes.photoWidth, sizes.photoHeight);
    PutReference(sizes.width, sizes.height);
    EXPECT_EQ(TurnAt(0, 7, 180, 6), 180);
    EXPECT_EQ(compare_->Calls().back().Parameters()[2], Trial(0));
  }
}

TEST_F(SameShape, IsAssumedForUnreadablePictures) {
  WriteFile(kReference, "no picture");
  EXPECT_EQ(TurnAt(0, 7, 180, 6), 180);
  PutReference(24, 32);
  WriteFile(kPhoto, "no picture");
  EXPECT_EQ(TurnAt(0, 7, 180, 6), 180);
  EXPECT_THAT(compare_->Calls(), SizeIs(4));
  EXPECT_EQ(compare_->Calls().back().Parameters()[2], Trial(0));
}

TEST_F(SameShape, LosesAgainstATurnThatCanBeMeasured) {
  PlanDistance(0, "");
  PlanDistance(180, Distance(65534));
  EXPECT_EQ(Turn(), 180);
}

TEST_F(RotationCheck, OnePixelOfDifferenceMakesAnotherShape) {
  PutPhoto(64, 63);
  PutReference(31, 32);
  EXPECT_EQ(TurnAt(90, 6, 270, 5), 270);
}

using TrialImage = RotationCheck;

TEST_F(TrialImage, IsMadeAsTheReferenceWas) {
  PutReference(24, 32);
  EXPECT_EQ(TurnAt(90, 5, 270, 6), 90);
  const std::vector<StubCall> calls = converter_->Calls();
  ASSERT_THAT(calls, SizeIs(2));
  for (size_t i = 0; i < calls.size(); ++i) {
    // The output is renamed when it is complete.
    EXPECT_THAT(
        calls[i].Parameters(),
        ElementsAre("-define", "registry:temporary-path=" + std::string(kThumbDir), kPhoto,
                    "-define", "jpeg:size=100x100", "-thumbnail", "100x100>^", "-quality", "77",
                    "+profile", "!icc,*", "-flatten", "-rotate", i == 0 ? "90" : "270",
                    "-colorspace", "sRGB", StartsWith(InThumbDir("VELAPHOTO.tmp."))));
  }
}

TEST_F(TrialImage, IsNotTurnedUpright) {
  EXPECT_EQ(TurnAt(0, 5, 180, 6), 0);
  const std::vector<StubCall> calls = converter_->Calls();
  ASSERT_THAT(calls, SizeIs(2));
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
  EXPECT_EQ(DetectThumbRotation({"/tmp/photos", none}, kPhoto, kThumbDir), 0);
  EXPECT_THAT(AllStubCalls(), IsEmpty());
}

TEST_F(TrialImage, NeedsTheConverter) {
  RemoveTool(kConverterPath);
  EXPECT_EQ(Turn(), 0);
  EXPECT_THAT(compare_->Calls(), IsEmpty());
}

TEST_F(TrialImage, NeedsThePhoto) {
  RemoveTree(kPhoto);
  EXPECT_EQ(Turn(), 0);
  EXPECT_THAT(AllStubCalls(), IsEmpty());
}

TEST_F(TrialImage, OfAnEarlierRunIsRemoved) {
  for (const char* name : {"Temp_0.jpg", "Temp_90.jpg", "Temp_270.jpg", "Temp_x.jpg"}) {
    WriteFile(InThumbDir(name), "left");
  }
  WriteFile(InThumbDir("Temp_0.png"), "of another program");
  RemoveTree(kReference);
  EXPECT_EQ(DetectThumbRotation(Job(), kPhoto, kThumbDir), 0);
  EXPECT_THAT(ThumbDirFiles(), ElementsAre("Temp_0.png"));
}

TEST_F(TrialImage, IsRemovedWhateverThePhotoIsCalled) {
  const std::string dir = "/tmp/photos/@eaDir/[a]*?\\.jpg";
  MakeDirectories(dir);
  MakePicture(dir + "/VELAPHOTO_THUMB_XL.jpg", 32, 24);
  EXPECT_EQ(DetectThumbRotation(Job(), kPhoto, dir), 0);
  EXPECT_THAT(converter_->Calls(), SizeIs(2));
  EXPECT_THAT(ListDirectory(dir), ElementsAre("VELAPHOTO_THUMB_XL.jpg"));
}

TEST_F(TrialImage, ThatCannotBeRemovedIsLogged) {
  MakeDirectories(Trial(90) + "/in.the.way");
  PlanDistance(0, Distance(7));
  PlanDistance(180, Distance(6));
  EXPECT_EQ(DetectThumbRotation(Job(), kPhoto, kThumbDir), 180);
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
