// Camera raw photos: those that cannot be decoded, and the decoded copy of the others.
#include <ctime>

#include "program/stub_program_test.h"
#include "support/images.h"

namespace vela_test {
namespace {

constexpr const char* kRaw = "/tmp/photos/a.nef";
const std::string kPpm = MetadataDirOf(kRaw) + "/RAW_TEMP.ppm";
const std::string kPreview = MetadataDirOf(kRaw) + "/VELAPHOTO_THUMB_RAW.jpg";

class BrokenRawPhoto : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    decoder_.emplace(kDcrawPath);
    decoder_->Plan(StubPlan().Exit(1));
    WriteFile(kRaw, "");
    SetFileTimeFromNow(kRaw, -60);
  }

  std::optional<StubTool> decoder_;
};

TEST_F(BrokenRawPhoto, FailsInAllPhases) {
  EXPECT_THAT(RunWithDaemon(), ElementsAre("POST_PHOTO_CONVERT /tmp/photos/a.nef"));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_EQ(MetadataOf(kRaw), kAllMarkers);
  ExpectProgress(1, 4);
  EXPECT_THAT(ProgressKeys(), ElementsAre("completed", "completed_thumb"));
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(BrokenRawPhoto, LosesTheThumbnailsItHad) {
  PutThumbs(kRaw, {"XL", "B", "S"});
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(MetadataOf(kRaw), kAllMarkers);
}

TEST_F(BrokenRawPhoto, IsCountedBeforeItIsReported) {
  std::string seen;
  RunAndObserve([&](const std::string&) { seen = ReadFile(kPhotoProgress); });
  EXPECT_EQ(seen, "completed=\"1\"\ncompleted_thumb=\"4\"\n");
}

TEST_F(BrokenRawPhoto, DoesNotStopTheOthers) {
  MakePhoto("/tmp/photos/b.jpg");
  EXPECT_THAT(ReportedPhotos(RunWithDaemon()), ElementsAre(kRaw, "/tmp/photos/b.jpg"));
  EXPECT_TRUE(Exists(Thumb("/tmp/photos/b.jpg", "B")));
}

TEST_F(BrokenRawPhoto, IsNotDecodedForLaterPhases) {
  PutThumbs(kRaw, {"XL", "M"});
  const DaemonPeer daemon;
  EXPECT_SUCCESS(Run());
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(ConvertedSources(), ElementsAre(Thumb(kRaw, "XL"), Thumb(kRaw, "XL")));
  EXPECT_EQ(AllStubCalls().size(), 2U);
  ExpectProgress(1, 2);
}

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

  /// A landscape preview, as large as the largest profile, that is to be turned into a portrait.
  void GivePreview() {
    JpegRecipe recipe;
    recipe.width = 1280;
    recipe.height = 8;
    recipe.orientation = 6;
    dcraw_->PlanWhen("-e", StubPlan().Print(ReadFile(MakeJpeg("/tmp/preview.jpg", recipe))));
  }

  /// The copy's modification time while the converter works on it.
  std::optional<FileTime> TimeOfCopy() const {
    Program program = StartAndPause();
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
  EXPECT_THAT(RunWithDaemon(),
              ElementsAre("GET_INDEX_VERSION " + kPpm, "POST_PHOTO_CONVERT /tmp/photos/a.nef"));
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPpm, Thumb(kRaw, "XL")));
  EXPECT_EQ(MetadataOf(kRaw), kThumbsOfFirstRun);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DecodedCopy, MayBeThePreview) {
  GivePreview();
  RunWithDaemon();
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPreview, Thumb(kRaw, "XL")));
  EXPECT_EQ(MetadataOf(kRaw), kThumbsOfFirstRun);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DecodedCopy, IsNotWhatIsRegistered) {
  dcraw_->PlanWhen("-i", StubPlan().Exit(1));
  RunWithDaemon();
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
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(MetadataOf(kRaw), kAllMarkers);
  EXPECT_THAT(ReportedPhotos(RequestsOf(daemon)), ElementsAre(kRaw));
  GivePreview();
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(MetadataOf(kRaw), kAllMarkers);
}

TEST_F(DecodedCopy, IsRemovedWhenALaterPhaseFails) {
  Converter().PlanCall(2, StubPlan().Exit(1));
  EXPECT_SUCCESS(Run());
  EXPECT_FALSE(Exists(kPpm));
  EXPECT_TRUE(Exists(Thumb(kRaw, "XL")));
  EXPECT_TRUE(Exists(Marker(kRaw, "B")));
}

TEST_F(DecodedCopy, OfAPhotoThatChangedMeanwhileIsRemoved) {
  dcraw_->PlanWhen("-w", StubPlan().Print("full decode").AppendToFile(kRaw, 100000));
  EXPECT_THAT(ReportedPhotos(RunWithDaemon()), ElementsAre(kRaw));
  EXPECT_EQ(MetadataOf(kRaw), kAllMarkers);
  EXPECT_THAT(Converter().Calls(), IsEmpty());
}

TEST_F(DecodedCopy, OfAPhotoFromTheFutureHasItsTime) {
  const int64_t future = std::time(nullptr) + 86400;
  SetFileTime(kRaw, future, 500);
  const auto time = TimeOfCopy();
  ASSERT_TRUE(time);
  EXPECT_EQ(*time, (FileTime{future, 0}));
}

TEST_F(DecodedCopy, OfAPhotoFromThePastHasItsOwnTime) {
  const int64_t begin = std::time(nullptr);
  const auto time = TimeOfCopy();
  ASSERT_TRUE(time);
  EXPECT_GE(time->seconds, begin - 1);
  EXPECT_LE(time->seconds, std::time(nullptr));
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

  /// Runs the program, after which no trial image and no preview is left.
  static void ExpectGone() {
    EXPECT_SUCCESS(Run());
    for (const std::string& name : MetadataOf(kRaw)) {
      EXPECT_NE(name.substr(0, 5), "Temp_");
    }
    EXPECT_FALSE(Exists(kPreview));
  }

  std::optional<DaemonPeer> daemon_;
};

TEST_F(TrialImages, AreMadeFromTheDecodedCopy) {
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPreview, kPreview, kPreview, Thumb(kRaw, "XL")));
  EXPECT_THAT(compare_->Calls(), SizeIs(2));
  EXPECT_EQ(daemon_->Requests().front().bytes.find(kRaw), std::string::npos);
  EXPECT_EQ(MetadataOf(kRaw), kThumbsOfFirstRun);
}

TEST_F(TrialImages, AreGoneWhenOneCannotBeMade) {
  Converter().PlanCall(2, StubPlan().Exit(1));
  ExpectGone();
  EXPECT_TRUE(Exists(Thumb(kRaw, "B")));
}

TEST_F(TrialImages, AreGoneWhenTheConverterFailsAfterThem) {
  Converter().PlanCall(3, StubPlan().Exit(1));
  ExpectGone();
  EXPECT_EQ(MetadataOf(kRaw), kAllMarkers);
}

TEST_F(TrialImages, AreGoneWithoutCompare) {
  RemoveTool(kComparePath);
  ExpectGone();
  EXPECT_TRUE(Exists(Thumb(kRaw, "B")));
}

}  // namespace
}  // namespace vela_test
