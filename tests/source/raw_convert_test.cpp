// From a raw photo to an ordinary image, with recording stubs.
#include <sys/stat.h>
#include <unistd.h>

#include "source/raw_image.h"
#include "source/source_fixture.h"

using namespace vela;

namespace vela_test {
namespace {

const std::string kDecodeFailure = "velathumb:660 Failed to convert raw /tmp/photos/a.dng to pnm";
const std::string kTurned =
    "velathumb:650 Failed to rotate /tmp/photos/@eaDir/a.dng/VELAPHOTO_THUMB_RAW.jpg to 90 degree";

/// The bytes of a preview of this size.
std::string PreviewOf(int width, int height, int orientation = 6) {
  const std::string bytes = ReadFile(MakePicture("/tmp/preview.jpg", width, height, orientation));
  RemoveTree("/tmp/preview.jpg");
  return bytes;
}

class RawConvert : public SourceTest {
 protected:
  void SetUp() override {
    SourceTest::SetUp();
    WriteFileOfSize(kRaw, 20000);
    AddProfile(60, "VELAPHOTO_THUMB_M.jpg");
    AddProfile(100, "VELAPHOTO_THUMB_XL.jpg");
    dcraw_.emplace(kDcrawPath);
    converter_.emplace(kConverterPath);
    exiftool_.emplace(kExiftoolPath);
    PlanPreview(StubPlan());
    PlanDecode(StubPlan().Print("full decode"));
  }

  void PlanPreview(const StubPlan& plan) { dcraw_->PlanWhen("-e", plan); }
  void PlanDecode(const StubPlan& plan) { dcraw_->PlanWhen("-w", plan); }
  void PlanPreviewOf(int width, int height) {
    PlanPreview(StubPlan().Print(PreviewOf(width, height)));
  }
  /// A preview that is large enough and marked upright, of a photo with another rotation.
  void PlanTurnedPreview(const std::string& rotation) {
    PlanPreview(StubPlan().Print(PreviewOf(100, 80, 1)));
    exiftool_->Plan(StubPlan().Print("Rotation: " + rotation + "\n"));
  }

  std::string Convert() const { return ConvertRawToJpeg(Job(), kRaw, kThumbDir); }

  /// Expects that thumbnails are made from the preview and the photo is not decoded.
  void ExpectPreview() const {
    EXPECT_EQ(Convert(), kPreview);
    EXPECT_THAT(ThumbDirFiles(), ElementsAre("VELAPHOTO_THUMB_RAW.jpg"));
    EXPECT_EQ(ParametersOf(dcraw_->Calls()), (ArgumentLists{{"-e", "-c", kRaw}}));
  }

  void ExpectFullDecode() const {
    EXPECT_EQ(Convert(), kPpm);
    EXPECT_THAT(ThumbDirFiles(), ElementsAre("RAW_TEMP.ppm"));
    EXPECT_EQ(ReadFile(kPpm), "full decode");
    EXPECT_EQ(ParametersOf(dcraw_->Calls()),
              (ArgumentLists{{"-e", "-c", kRaw}, {"-w", "-c", kRaw}}));
    EXPECT_THAT(exiftool_->Calls(), IsEmpty());
    EXPECT_THAT(converter_->Calls(), IsEmpty());
  }

  void ExpectNothing() const {
    EXPECT_EQ(Convert(), "");
    EXPECT_THAT(ThumbDirFiles(), IsEmpty());
  }

  std::optional<StubTool> dcraw_;
  std::optional<StubTool> converter_;
  std::optional<StubTool> exiftool_;
};

using RawPreview = RawConvert;

TEST_F(RawPreview, AsLargeAsTheLargestProfileIsEnough) {
  PlanPreviewOf(100, 80);
  ExpectPreview();
  EXPECT_EQ(ReadFile(kPreview), PreviewOf(100, 80));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawPreview, IsMeasuredByItsLongerSide) {
  PlanPreviewOf(80, 100);
  ExpectPreview();
}

TEST_F(RawPreview, LargerIsEnough) {
  PlanPreviewOf(160, 20);
  ExpectPreview();
}

TEST_F(RawPreview, OnePixelSmallerIsNotEnough) {
  PlanPreviewOf(99, 99);
  ExpectFullDecode();
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawPreview, IsMeasuredAgainstAllPhases) {
  PlanPreviewOf(100, 80);
  ThumbnailProfileList list;
  list.all.push_back(
      std::make_unique<const ThumbnailProfile>(60, 90, "", "VELAPHOTO_THUMB_M.jpg", 0));
  list.phase0.push_back(list.all.back().get());
  list.all.push_back(
      std::make_unique<const ThumbnailProfile>(101, 90, "", "VELAPHOTO_THUMB_B.jpg", 2));
  list.phase2.push_back(list.all.back().get());
  EXPECT_EQ(ConvertRawToJpeg({"/tmp/photos", list}, kRaw, kThumbDir), kPpm);
}

TEST_F(RawPreview, MissingLeadsToTheFullDecode) {
  ExpectFullDecode();
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawPreview, UnreadableLeadsToTheFullDecode) {
  PlanPreview(StubPlan().Print("no picture"));
  ExpectFullDecode();
}

TEST_F(RawPreview, CutWithinItsHeaderLeadsToTheFullDecode) {
  PlanPreview(StubPlan().Print(PreviewOf(100, 80).substr(0, 40)).DieBySignal(SIGSEGV));
  ExpectFullDecode();
}

TEST_F(RawPreview, ThatCannotBeStoredLeadsToTheFullDecode) {
  MakeDirectories(kPreview + "/in.the.way");
  EXPECT_EQ(Convert(), kPpm);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:574 fopen failed, path=" + kPreview + ", errno=21"));
}

TEST_F(RawPreview, OfAnEarlierRunIsNotUsed) {
  WriteFile(kPreview, PreviewOf(200, 100));
  ExpectFullDecode();
}

TEST_F(RawPreview, IsTurnedInPlace) {
  PlanTurnedPreview("90");
  converter_->Plan(StubPlan().WriteFile(kPreview, "turned"));
  ExpectPreview();
  EXPECT_EQ(ReadFile(kPreview), "turned");
  EXPECT_EQ(ParametersOf(exiftool_->Calls()), (ArgumentLists{{"-S", "-Rotation", kRaw}}));
  ASSERT_EQ(ParametersOf(converter_->Calls()),
            (ArgumentLists{{"-rotate", "90", kPreview, kPreview}}));
  EXPECT_EQ(converter_->Calls().front().arguments.front(), kConverterPath);
  // The line contains "Failed" although it announces a turn.
  EXPECT_THAT(ErrorLines(), ElementsAre(kTurned));
}

TEST_F(RawPreview, IsTurnedAsFarAsThePhotoSays) {
  for (const char* degrees : {"180", "270", "1"}) {
    PlanTurnedPreview(degrees);
    EXPECT_EQ(Convert(), kPreview);
    ASSERT_FALSE(converter_->Calls().empty());
    EXPECT_THAT(converter_->Calls().back().Parameters(),
                ElementsAre("-rotate", degrees, kPreview, kPreview));
  }
}

TEST_F(RawPreview, IsNotTurnedByNothing) {
  for (const char* degrees : {"0", "-90", "upright", " "}) {
    PlanTurnedPreview(degrees);
    EXPECT_EQ(Convert(), kPreview);
  }
  EXPECT_THAT(converter_->Calls(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawPreview, ThatCannotBeTurnedIsSilentlyUsedAsItIs) {
  PlanTurnedPreview("90");
  for (const auto& plan : {StubPlan().Exit(1), StubPlan().DieBySignal(SIGSEGV)}) {
    converter_->Plan(plan);
    EXPECT_EQ(Convert(), kPreview);
    EXPECT_EQ(ReadFile(kPreview), PreviewOf(100, 80, 1));
  }
  RemoveTool(kConverterPath);
  EXPECT_EQ(Convert(), kPreview);
  EXPECT_EQ(converter_->Calls().size(), 2U);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawPreview, WithoutExifIsUsedAsItIs) {
  PlanPreview(StubPlan().Print(ReadFile(MakePicture("/tmp/plain.jpg", 100, 80))));
  ExpectPreview();
  EXPECT_THAT(exiftool_->Calls(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:696 velathumb (696) File not readable or no "
                                        "EXIF data in file " +
                                        kPreview + ".\n"));
}

TEST_F(RawPreview, IsUsedAsItIsWithoutExiftool) {
  PlanTurnedPreview("90");
  RemoveTool(kExiftoolPath);
  ExpectPreview();
  EXPECT_THAT(converter_->Calls(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:196 [Error] VLIBCPopen: "
                                        "/usr/vela/bin/exiftool -S -Rotation /tmp/photos/a.dng"));
}

using RawDecode = RawConvert;

TEST_F(RawDecode, WithoutOutputIsAFailure) {
  PlanDecode(StubPlan().PrintError("a.dng: unexpected end of file\n").Exit(1));
  ExpectNothing();
  EXPECT_THAT(ErrorLines(), ElementsAre(kDecodeFailure));
}

TEST_F(RawDecode, NeedsTheDecoder) {
  RemoveTool(kDcrawPath);
  ExpectNothing();
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:569 VLIBCPopen [/usr/bin/dcraw -e -c] failed",
                                        "velathumb:569 VLIBCPopen [/usr/bin/dcraw -w -c] failed",
                                        kDecodeFailure));
}

TEST_F(RawDecode, OfADecoderThatCrashesIsUsed) {
  // Whether it is a picture is for the converter to decide.
  PlanDecode(StubPlan().Print("full decode").DieBySignal(SIGSEGV));
  ExpectFullDecode();
}

TEST_F(RawDecode, IsNotTurned) {
  PlanPreview(StubPlan().Print(PreviewOf(99, 80, 1)));
  exiftool_->Plan(StubPlan().Print("Rotation: 90\n"));
  ExpectFullDecode();
}

TEST_F(RawDecode, NeedsADirectory) {
  RemoveTree("/tmp/photos/@eaDir");
  PlanPreviewOf(100, 80);
  EXPECT_EQ(Convert(), "");
  EXPECT_THAT(
      ErrorLines(),
      ElementsAre("velathumb:574 fopen failed, path=" + kPreview + ", errno=2",
                  "velathumb:574 fopen failed, path=" + kPpm + ", errno=2", kDecodeFailure));
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir"));
}

TEST_F(RawDecode, OnAFullVolumeLeavesNothing) {
  SmallVolume volume(kThumbDir, 1U << 20U);
  WriteFile(InThumbDir("other"), "x");
  PlanPreviewOf(100, 80);
  PlanDecode(StubPlan().FillVolume(kThumbDir).PrintRepeated(std::string(4096, 'x'), 600));
  volume.SetAvailable(0);
  EXPECT_EQ(Convert(), "");
  EXPECT_THAT(ThumbDirFiles(), ElementsAre("other"));
  const std::string full = ", No space left on device";
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:590 write failed, path=" + kPreview + full,
                          "velathumb:590 write failed, path=" + kPpm + full, kDecodeFailure));
}

TEST_F(RawDecode, UsesTheSpaceOfARemovedPartialPreview) {
  SmallVolume volume(kThumbDir, 1U << 20U);
  WriteFile(InThumbDir("other"), "x");
  volume.SetAvailable(2 * SmallVolume::PageSize());
  PlanPreview(StubPlan().PrintRepeated(std::string(SmallVolume::PageSize() / 2, 'x'), 20));
  EXPECT_EQ(Convert(), kPpm);
  EXPECT_THAT(ThumbDirFiles(), ElementsAre("RAW_TEMP.ppm", "other"));
}

/// The bytes of a number, little-endian.
std::string Bytes(uint32_t number, int count) {
  std::string bytes;
  for (int i = 0; i < count; ++i) bytes += static_cast<char>(number >> (8 * i) & 0xff);
  return bytes;
}

/// One number of a TIFF header.
std::string Tag(uint32_t tag, uint32_t number) {
  return Bytes(tag, 2) + Bytes(4, 2) + Bytes(1, 4) + Bytes(number, 4);
}

/// The header of a raw photo of this size, without pixels.
std::string HeaderOf(uint32_t width, uint32_t height) {
  constexpr uint32_t kSubfileType = 254;
  constexpr uint32_t kImageWidth = 256;
  constexpr uint32_t kImageLength = 257;
  return std::string("II*\0", 4) + Bytes(8, 4) + Bytes(3, 2) + Tag(kSubfileType, 0) +
         Tag(kImageWidth, width) + Tag(kImageLength, height) + Bytes(0, 4);
}

struct ClaimedSize : NamedCase {
  uint32_t width;
  uint32_t height;
  std::string settings;
  bool isDecoded;
};

class RawLimit : public RawConvert, public ::testing::WithParamInterface<ClaimedSize> {};

TEST_P(RawLimit, RefusesTheFullDecodeOfMorePixels) {
  WriteFile(kRaw, HeaderOf(GetParam().width, GetParam().height));
  WriteFile("/etc/velainfo.conf", GetParam().settings);
  if (GetParam().isDecoded) {
    ExpectFullDecode();
    EXPECT_THAT(ErrorLines(), IsEmpty());
    return;
  }
  ExpectNothing();
  EXPECT_EQ(ParametersOf(dcraw_->Calls()), (ArgumentLists{{"-e", "-c", kRaw}}));
  EXPECT_THAT(ErrorLines(), ElementsAre(kDecodeFailure));
}

INSTANTIATE_TEST_SUITE_P(
    Sizes, RawLimit,
    ::testing::Values(ClaimedSize{"LargeCamera", 14204, 10652, "", true},
                      ClaimedSize{"AtTheDefault", 25000, 20000, "", true},
                      ClaimedSize{"AboveTheDefault", 25000, 20001, "", false},
                      ClaimedSize{"Largest", 65535, 65535, "", false},
                      ClaimedSize{"UnknownSize", 4294967295, 4294967295, "", true},
                      ClaimedSize{"AtTheSetting", 10, 10, "raw_pixel_limit=100\n", true},
                      ClaimedSize{"AboveTheSetting", 10, 11, "raw_pixel_limit=100\n", false},
                      ClaimedSize{"NoLimit", 65535, 65535, "raw_pixel_limit=0\n", true},
                      ClaimedSize{"InvalidSetting", 65535, 65535, "raw_pixel_limit=1G\n", false},
                      ClaimedSize{"NoSize", 0, 65535, "", true}),
    CaseName());

using RawFile = RawConvert;

TEST_F(RawFile, ThatIsNoRegularFileIsRefused) {
  const std::vector<std::function<void()>> kinds = {[] {},  // missing
                                                    [] { MakeDirectories(kRaw); },
                                                    [] { ASSERT_EQ(mkfifo(kRaw, 0666), 0); }};
  for (const auto& make : kinds) {
    RemoveTree(kRaw);
    make();
    ClearLog();
    ExpectNothing();
    EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:628 /tmp/photos/a.dng is not regular file"));
  }
  EXPECT_THAT(dcraw_->Calls(), IsEmpty());
}

TEST_F(RawFile, ThatIsALinkToAPhotoIsAPhoto) {
  ASSERT_EQ(rename(kRaw, "/tmp/photos/real.dng"), 0);
  ASSERT_EQ(symlink("/tmp/photos/real.dng", kRaw), 0);
  ExpectFullDecode();
}

TEST_F(RawFile, WhoseBlocksGrowMeanwhileIsNotUsed) {
  PlanDecode(StubPlan().Print("full decode").GrowBlocksOnly(kRaw, 8192));
  ExpectNothing();
  EXPECT_EQ(FileSize(kRaw), 20000);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawFile, WhoseBlocksGrowDuringThePreviewIsNotUsed) {
  PlanPreview(StubPlan().Print(PreviewOf(100, 80)).AppendToFile(kRaw, 8192));
  ExpectNothing();
  EXPECT_EQ(dcraw_->Calls().size(), 1U);
}

TEST_F(RawFile, WhoseBlocksGrowDuringTheTurnIsNotUsed) {
  PlanTurnedPreview("90");
  converter_->Plan(StubPlan().GrowBlocksOnly(kRaw, 8192));
  ExpectNothing();
}

TEST_F(RawFile, WhoseBlocksShrinkIsNotUsed) {
  PlanDecode(StubPlan().Print("full decode").WriteFile(kRaw, "x"));
  ExpectNothing();
}

TEST_F(RawFile, WhoseBlocksStayIsUsedDespiteOtherChanges) {
  PlanDecode(StubPlan().Print("full decode").GrowSizeOnly(kRaw, 100000).SetFileTime(kRaw, 5));
  ExpectFullDecode();
  EXPECT_EQ(FileSize(kRaw), 120000);
}

TEST_F(RawFile, ThatIsRemovedMeanwhileIsNotUsed) {
  PlanDecode(StubPlan().Print("full decode").Remove(kRaw));
  ExpectNothing();
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
