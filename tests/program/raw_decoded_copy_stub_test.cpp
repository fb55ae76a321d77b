// What becomes of the decoded copy of a raw photo, with recording stubs.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <ctime>
#include <optional>
#include <string>
#include <vector>

#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/images.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::IsEmpty;

constexpr const char* kRaw = "/tmp/photos/a.nef";
const std::string kPpm = MetadataDirOf(kRaw) + "/RAW_TEMP.ppm";
const std::string kPreview = MetadataDirOf(kRaw) + "/VELAPHOTO_THUMB_RAW.jpg";
constexpr const char* kMarkers[] = {"VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                                    "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"};

class DecodedCopy : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    WriteFileOfSize(kRaw, 20000);
    SetFileTimeFromNow(kRaw, -60);
    dcraw_.emplace(kDcrawPath);
    compare_.emplace(kComparePath);
    compare_->Plan(StubPlan().PrintError("5 (0.1)\n").Exit(1));
    dcraw_->PlanWhen("-e", StubPlan().Exit(1));
    dcraw_->PlanWhen("-w", StubPlan().Print("full decode"));
    dcraw_->PlanWhen("-i", StubPlan().Print("Output size: 640 x 480\n"));
  }

  /// A preview as large as the largest profile, held otherwise.
  void GivePreview() {
    JpegRecipe recipe;
    recipe.width = 1280;
    recipe.height = 8;
    recipe.orientation = 6;
    dcraw_->PlanWhen("-e", StubPlan().Print(ReadFile(MakeJpeg("/tmp/preview.jpg", recipe))));
  }

  /// The copy's modification time while the converter works on it.
  static std::optional<FileTime> TimeOfCopy() {
    Program program = Start();
    EXPECT_TRUE(IsConverterPaused());
    std::optional<FileTime> time;
    if (Exists(kPpm)) {
      time = ModificationTime(kPpm);
    }
    Go();
    EXPECT_TRUE(program.Wait());
    EXPECT_FALSE(Exists(kPpm));
    return time;
  }

  std::optional<StubTool> dcraw_;
  std::optional<StubTool> compare_;
};

TEST_F(DecodedCopy, IsConvertedAndRemoved) {
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPpm, Thumb(kRaw, "XL")));
  EXPECT_THAT(MetadataOf(kRaw), ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                                            "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(RequestsOf(daemon),
              ElementsAre("GET_INDEX_VERSION " + kPpm, "POST_PHOTO_CONVERT /tmp/photos/a.nef"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DecodedCopy, MayBeThePreview) {
  const DaemonPeer daemon;
  GivePreview();
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPreview, Thumb(kRaw, "XL")));
  EXPECT_THAT(MetadataOf(kRaw), ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                                            "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DecodedCopy, IsNotWhatIsRegistered) {
  const DaemonPeer daemon;
  dcraw_->PlanWhen("-i", StubPlan().Exit(1));
  EXPECT_GOOD_END(Run());
  EXPECT_TRUE(Exists(Thumb(kRaw, "B")));
  EXPECT_FALSE(Exists("/var/lib/velaindex/index.db"));
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:469 [Error] GetImageResolution: /tmp/photos/a.nef"));
  const std::vector<StubCall> calls = AllStubCalls();
  ASSERT_EQ(calls.size(), 5U);
  EXPECT_EQ(calls[2].path, kConverterPath);
  EXPECT_THAT(calls[3].Parameters(), ElementsAre("-i", "-v", kRaw));
}

TEST_F(DecodedCopy, IsRemovedWhenTheConverterFails) {
  const DaemonPeer daemon;
  Converter().Plan(StubPlan().Exit(1));
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(MetadataOf(kRaw), ElementsAreArray(kMarkers));
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre(kRaw));
  GivePreview();
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(MetadataOf(kRaw), ElementsAreArray(kMarkers));
}

TEST_F(DecodedCopy, IsRemovedWhenALaterPhaseFails) {
  Converter().PlanCall(2, StubPlan().Exit(1));
  EXPECT_GOOD_END(Run());
  EXPECT_FALSE(Exists(kPpm));
  EXPECT_TRUE(Exists(Thumb(kRaw, "XL")));
  EXPECT_TRUE(Exists(Marker(kRaw, "B")));
}

TEST_F(DecodedCopy, OfAPhotoThatChangedMeanwhileIsRemoved) {
  const DaemonPeer daemon;
  dcraw_->PlanWhen("-w", StubPlan().Print("full decode").AppendToFile(kRaw, 100000));
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(MetadataOf(kRaw), ElementsAreArray(kMarkers));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre(kRaw));
}

TEST_F(DecodedCopy, OfAPhotoFromTheFutureHasItsTime) {
  const int64_t future = std::time(nullptr) + 86400;
  SetFileTime(kRaw, future, 500);
  PauseConverter();
  const auto time = TimeOfCopy();
  ASSERT_TRUE(time);
  EXPECT_EQ(*time, (FileTime{future, 0}));
}

TEST_F(DecodedCopy, OfAPhotoFromThePastHasItsOwnTime) {
  const int64_t begin = std::time(nullptr);
  PauseConverter();
  const auto time = TimeOfCopy();
  ASSERT_TRUE(time);
  EXPECT_GE(time->seconds, begin - 1);
  EXPECT_LE(time->seconds, std::time(nullptr));
}

TEST_F(DecodedCopy, IsWhatTheIndexAndTheTrialImagesAreFor) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(1);
  PutThumbs(kRaw, {"XL"});
  SetFileTimeFromNow(Thumb(kRaw, "XL"), -3600);
  GivePreview();
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPreview, kPreview, kPreview, Thumb(kRaw, "XL")));
  EXPECT_EQ(compare_->Calls().size(), 2U);
  EXPECT_EQ(daemon.Requests().front().bytes.find(kRaw), std::string::npos);
  EXPECT_THAT(MetadataOf(kRaw), ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                                            "VELAPHOTO_THUMB_XL.jpg"));
}

class TrialImages : public DecodedCopy {
 protected:
  void SetUp() override {
    DecodedCopy::SetUp();
    daemon_.emplace();
    daemon_->SetIndexVersion(1);
    PutThumbs(kRaw, {"XL"});
    SetFileTimeFromNow(Thumb(kRaw, "XL"), -3600);
    GivePreview();
  }

  void ExpectGone() const {
    for (const std::string& name : MetadataOf(kRaw)) {
      EXPECT_NE(name.substr(0, 5), "Temp_");
    }
    EXPECT_FALSE(Exists(kPreview));
  }

  std::optional<DaemonPeer> daemon_;
};

TEST_F(TrialImages, AreGoneWhenOneCannotBeMade) {
  Converter().PlanCall(2, StubPlan().Exit(1));
  EXPECT_GOOD_END(Run());
  ExpectGone();
  EXPECT_TRUE(Exists(Thumb(kRaw, "B")));
}

TEST_F(TrialImages, AreGoneWhenTheConverterFailsAfterThem) {
  Converter().PlanCall(3, StubPlan().Exit(1));
  EXPECT_GOOD_END(Run());
  ExpectGone();
  EXPECT_THAT(MetadataOf(kRaw), ElementsAreArray(kMarkers));
}

TEST_F(TrialImages, AreGoneWithoutCompare) {
  RemoveTool(kComparePath);
  EXPECT_GOOD_END(Run());
  ExpectGone();
  EXPECT_TRUE(Exists(Thumb(kRaw, "B")));
}

}  // namespace
}  // namespace vela_test
