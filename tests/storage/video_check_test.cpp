// Whether a video has the converted videos for browsers, for mobile devices, and for the settings.
#include <unistd.h>

#include <map>
#include <tuple>
#include <utility>

#include "storage/velamk_util.h"
#include "storage/video_fixture.h"
#include "support/mounts.h"
#include "support/named_case.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAreArray;
using ::testing::Values;
using ::testing::ValuesIn;

constexpr const char* kMobileWanted = "enable_mobile_video=\"yes\"\n";
constexpr const char* kMobileNotWanted = "enable_mobile_video=\"no\"\n";

constexpr const char* kGoodRecord = R"({"success":true,"media":{"bitrate":4499999}})";
constexpr const char* kPoorRecord = R"({"success":true,"media":{"bitrate":4500000}})";
constexpr const char* kFailedRecord = R"({"success":false,"media":{"bitrate":1}})";
constexpr const char* kLargeButNoBitrate =
    R"({"success":true,"media":{"width":5000000,"height":5000000,"size":5000000,)"
    R"("duration":5000000,"mtime":5000000}})";
constexpr const char* kGoodPortraitRecord =
    R"({"success":true,"media":{"width":480,"height":640,"bitrate":1}})";
/// In place of a record: the daemon closes the connection or is not running.
constexpr const char* kConnectionClosed = "closed";
constexpr const char* kNoDaemon = "none";

/// In place of a size: the file is a readable video.
constexpr int kPortrait = -1;
constexpr int kLandscape = -2;

/// A file in the metadata directory with its size in bytes.
struct DerivedFile {
  DerivedFile(const ConvertedVideo& video, int bytes = 10) : name(video.name), size(bytes) {}
  DerivedFile(const char* fileName, int bytes = 10) : name(fileName), size(bytes) {}

  std::string name;
  int size;
};

/// Both files of each of these.
std::vector<DerivedFile> AllOf(const std::vector<ConvertedVideo>& videos, int size) {
  std::vector<DerivedFile> files;
  for (const char* name : NamesOf(videos)) {
    files.emplace_back(name, size);
  }
  return files;
}

/// Placeholders for the converted video that only one check uses for rotated videos, and for that
/// of the other check.
constexpr ConvertedVideo kOwn = {"own", "own, older"};
constexpr ConvertedVideo kForeign = {"foreign", "foreign, older"};

constexpr int kUnreadable = -1;

/// A video and how it is checked.
struct Situation : NamedCase {
  int (*isConverted)(const char* path);
  int rotation;  ///< degrees, or kUnreadable
  const char* usualRecord;
  const char* settings = "";
  ConvertedVideo own = kFlash;
  ConvertedVideo foreign = kConversion;
};

/// What a check returns, how often it asks the daemon, and the files it removes.
struct Judgement {
  int isConverted = 0;
  size_t requests = 0;
  std::vector<std::string> removed = {};
};

struct VideoCase : NamedCase {
  std::vector<DerivedFile> files;  ///< content of the metadata directory
  Judgement expected;
  /// The daemon's answers in order, the last one for the rest; the usual one when empty.
  std::vector<std::string> records = {};
  std::vector<int> unknownAt = {};  ///< source lines of the messages about missing records
};

class VideoCheckTest : public VideoTest {
 protected:
  void Prepare(const Situation& situation) {
    check_ = situation.isConverted;
    WriteFile(kSettings, situation.settings);
    if (situation.rotation != kUnreadable) {
      MakeVideo(situation.rotation);
    }
  }

  int Check() const { return check_(Media().c_str()); }

  void SetRecords(const std::vector<std::string>& records) {
    SetRecord(records.back());
    for (const std::string& record : records) {
      if (record == kNoDaemon) {
        StopDaemon();
      } else if (record == kConnectionClosed) {
        Daemon().AnswerNext(DaemonReply::CloseAfterRequest());
      } else {
        SetNextRecord(record);
      }
    }
  }

  void Make(const std::string& name, int size) const {
    if (size == kPortrait) {
      MakePortrait(name);
    } else if (size == kLandscape) {
      MakeLandscape(name);
    } else {
      MakeDerived(name, static_cast<size_t>(size));
    }
  }

  /// The log lines about a record that is missing in a check of this source line.
  static std::vector<std::string> UnknownLines(int line) {
    return {kDaemonFailed, "velamk_util:" + std::to_string(line) +
                               " fail to get media from plugin db: /tmp/media/film.mp4"};
  }

 private:
  int (*check_)(const char* path) = nullptr;
};

class VideoCases : public VideoCheckTest,
                   public ::testing::WithParamInterface<std::tuple<Situation, VideoCase>> {
 protected:
  void SetUp() override {
    VideoCheckTest::SetUp();
    Prepare(situation_);
    SetRecords(row_.records.empty() ? std::vector<std::string>{situation_.usualRecord}
                                    : row_.records);
    for (const DerivedFile& file : row_.files) {
      Make(Name(file.name), file.size);
    }
  }

  std::string Name(const std::string& name) const {
    const std::map<std::string, std::string> names = {
        {kOwn.name, situation_.own.name},
        {kOwn.oldName, situation_.own.oldName},
        {kForeign.name, situation_.foreign.name},
        {kForeign.oldName, situation_.foreign.oldName}};
    const auto found = names.find(name);
    return found == names.end() ? name : found->second;
  }

  std::vector<std::string> ExpectedFiles() const {
    std::vector<std::string> files;
    for (const DerivedFile& file : row_.files) {
      if (std::count(row_.expected.removed.begin(), row_.expected.removed.end(), file.name) == 0) {
        files.push_back(Name(file.name));
      }
    }
    return files;
  }

  std::vector<std::string> ExpectedLog() const {
    std::vector<std::string> lines;
    if (situation_.rotation == kUnreadable) {
      lines.emplace_back(kUnreadableVideo);
    }
    for (const int line : row_.unknownAt) {
      const std::vector<std::string> unknown = UnknownLines(line);
      lines.insert(lines.end(), unknown.begin(), unknown.end());
    }
    return lines;
  }

  const Situation situation_ = std::get<0>(GetParam());
  const VideoCase row_ = std::get<1>(GetParam());
};

TEST_P(VideoCases, AreJudged) {
  EXPECT_EQ(Check(), row_.expected.isConverted);
  EXPECT_THAT(Left(), UnorderedElementsAreArray(ExpectedFiles()));
  EXPECT_EQ(RequestCount(), row_.expected.requests);
  EXPECT_THAT(TakeErrorLines(), ElementsAreArray(ExpectedLog()));
}

const std::vector<VideoCase> kUprightWebCases = {
    {"SmallHighHidesItsOlderName", {{kHigh, 1}, {kHigh.oldName, 10}}, {0}},
    {"HighHidesItsSmallOlderName", {{kHigh, 2}, {kHigh.oldName, 0}}, {1}},
    {"SmallFilesOnly", {{kHigh, 1}, {kIphone, 0}}, {0}},
    {"FlashAfterSmallFiles", {{kHigh, 1}, {kIphone, 0}, {kFlash.oldName, 2}}, {1}},
    {"OrientationDoesNotMatter", {{kFlash, kPortrait}}, {1}, {kLandscapeRecord}},
    {"H264OfPoorQuality", {kH264}, {0, 1}, {kPoorRecord}},
    {"OnlyTheBitrateIsQuality", {kH264}, {1, 1}, {kLargeButNoBitrate}},
    {"FailedRecordForH264", {kH264}, {0, 1}, {kFailedRecord}, {243}},
    {"ConnectionClosedForH264", {kH264}, {0, 1}, {kConnectionClosed}, {243}},
    {"H264WithoutDaemon", {kH264}, {0, 0}, {kNoDaemon}, {243}},
    {"FlashWithoutDaemon", {kH264, kFlash}, {1}, {kNoDaemon}},
};
const std::vector<VideoCase> kUprightMobileCases = {
    {"GoodH264EndsTheSearch", {kH264, kIphone, kMpeg4, kConversion}, {1, 1}, {kGoodRecord}},
    {"IphoneAfterPoorH264", {kH264, kIphone}, {1, 2}, {kPoorRecord, kGoodRecord}},
    {"PoorH264AndPoorIphone", {kH264, kIphone}, {0, 2}, {kPoorRecord}},
    {"SmallH264NeedsNoRecord", {{kH264, 1}, kIphone}, {0, 1}, {kNoRecord}, {357}},
    {"Mpeg4AfterUnknownIphone", {kMpeg4, kConversion, kIphone}, {1, 1}, {kNoRecord}, {357}},
    {"Mpeg4AfterUnknownH264", {kMpeg4, kConversion, kIphone, kH264}, {1, 1}, {kNoRecord}, {344}},
    {"NoIphoneAfterUnknownH264", {kH264, kIphone}, {0, 1}, {kNoRecord, kGoodRecord}, {344}},
    {"TwoBytesOfMpeg4Suffice", {kH264, kIphone, {kMpeg4, 2}}, {1, 1}, {kNoRecord}, {344}},
    {"TwoBytesOfConversionSuffice", {kH264, kIphone, {kConversion, 2}}, {1, 1}, {kNoRecord}, {344}},
    {"FailedRecordForIphone", {kIphone.oldName}, {0, 1}, {kFailedRecord}, {357}},
    {"ClosedForIphoneOnly", {kH264, kIphone}, {0, 2}, {kPoorRecord, kConnectionClosed}, {357}},
    {"H264WithoutDaemon", {kH264, kIphone}, {0, 0}, {kNoDaemon}, {344}},
    {"IphoneWithoutDaemon", {kIphone}, {0, 0}, {kNoDaemon}, {357}},
    {"Mpeg4WithoutDaemon", {kIphone, kMpeg4}, {1, 0}, {kNoDaemon}, {357}},
    {"OrientationDoesNotMatter", {{kConversion, kPortrait}}, {1}, {kLandscapeRecord}},
};
const std::vector<VideoCase> kUnreadableWebCases = {
    {"NoFile", {}, {0}},
    {"H264", {kH264}, {0, 1}, {kNoRecord}, {243}},
    {"FlashOfTheOtherOrientation", {{kFlash, kPortrait}, kH264}, {1}, {kLandscapeRecord}},
};
const std::vector<VideoCase> kUnreadableMobileCases = {
    {"ConversionOfTheOtherOrientation", {{kConversion, kPortrait}}, {1}, {kLandscapeRecord}},
    {"Iphone", {kIphone}, {0, 1}, {kNoRecord}, {357}},
};
const std::vector<VideoCase> kRotatedCases = {
    {"NoFile", {}, {0}},
    {"LandscapeForPortrait", {{kLow, kLandscape}}, {0, 1}},
    {"LandscapeForLandscape", {{kLow, kLandscape}}, {1, 1}, {kLandscapeRecord}},
    {"NoneMatches", AllOf({kHigh, kMedium, kLow, kMobile}, kLandscape), {0, 4}},
    {"UselessOnes",
     AllOf({kH264, kIphone, kMpeg4, kForeign}, kPortrait),
     {0},
     {kGoodPortraitRecord}},
    // A file that cannot be read counts as landscape, even an empty one.
    {"EmptyForPortrait", {{kMedium, 0}}, {0, 1}},
    {"EmptyForLandscape", {{kMedium, 0}}, {1, 1}, {kLandscapeRecord}},
    {"EmptyOwnForPortrait", {{kOwn, 0}}, {0, 1, {kOwn.name}}},
    {"EmptyOwnForLandscape", {{kOwn, 0}}, {1, 1}, {kLandscapeRecord}},
    {"OwnMatches", {{kOwn, kPortrait}}, {1, 1}},
    {"OldOwnMatches", {{kOwn.oldName, kPortrait}}, {1, 1}},
    {"OwnDiffers", {{kOwn, kLandscape}}, {0, 1, {kOwn.name}}},
    {"OldOwnDiffers", {{kOwn.oldName, kLandscape}}, {0, 1, {kOwn.oldName}}},
    {"BothOwnGo",
     {{kOwn, kLandscape}, {kOwn.oldName, kPortrait}, kH264, kMpeg4, {kForeign, kLandscape}},
     {0, 1, {kOwn.name, kOwn.oldName}}},
    {"BothOwnStay", {{kOwn, kPortrait}, {kOwn.oldName, kLandscape}}, {1, 1}},
    {"OnlyOwnMatches", {{kHigh, kLandscape}, {kOwn, kPortrait}}, {1, 2}},
    {"OnlyOldMobileMatches", {{kMobile.oldName, kPortrait}, {kOwn, kLandscape}}, {1, 1}},
    {"LowAndOwnDiffer", {{kLow, kLandscape}, {kOwn, kLandscape}}, {0, 2, {kOwn.name}}},
    // Without a record the video counts as landscape.
    {"PortraitWithoutRecord",
     {{kHigh, kPortrait}, {kOwn, kPortrait}},
     {0, 2, {kOwn.name}},
     {kNoRecord},
     {128, 128}},
    {"LandscapeWithoutRecord",
     {{kHigh, kPortrait}, {kOwn, kLandscape}},
     {1, 2},
     {kNoRecord},
     {128, 128}},
    {"PortraitWithoutDaemon", {{kOwn, kPortrait}}, {0, 0, {kOwn.name}}, {kNoDaemon}, {128}},
    {"NoRecordForTheFirst",
     {{kHigh, kPortrait}, {kOwn, kPortrait}},
     {1, 2},
     {kNoRecord, kPortraitRecord},
     {128}},
    {"NoRecordForTheSecond",
     {{kHigh, kLandscape}, {kOwn, kPortrait}},
     {0, 2, {kOwn.name}},
     {kPortraitRecord, kNoRecord},
     {128}},
};
const std::vector<VideoCase> kForWebOnlyCases = {
    {"NoFile", {}, {0}},
    {"High", {kHigh}, {1}},
    {"OlderMediumOfOneByte", {{kMedium.oldName, 1}}, {0}},
    {"OlderMediumOfTwoBytes", {{kMedium.oldName, 2}}, {1}},
    {"Flash", {kFlash}, {1}},
    {"Mpeg4AndConversion", {kMpeg4, kConversion}, {0}},
    {"H264", {kH264}, {1, 1}},
};
const std::vector<VideoCase> kForMobileTooCases = {
    {"NoFile", {}, {0}},
    {"High", {kHigh}, {1}},
    {"Flash", {kFlash}, {0}},
    {"FlashAndMpeg4", {kFlash, kMpeg4}, {1}},
    {"Mpeg4AndConversion", {kMpeg4, kConversion}, {0}},
    {"H264GoodForBoth", {kH264}, {1, 2}},
    {"H264GoodForWebOnly", {kH264}, {0, 2}, {kGoodRecord, kPoorRecord}},
    {"H264WithoutRecord", {kH264}, {0, 1}, {kNoRecord}, {243}},
    {"IphoneWithoutRecord", {kIphone}, {0, 1}, {kNoRecord}, {357}},
};
const std::vector<VideoCase> kRotatedForWebOnlyCases = {
    {"LandscapeFlash", {{kFlash, kLandscape}}, {0, 1, {kFlash.name}}},
    {"PortraitFlashAndLandscapeConversion",
     {{kFlash, kPortrait}, {kConversion, kLandscape}},
     {1, 1}},
};
const std::vector<VideoCase> kRotatedForMobileTooCases = {
    {"PortraitFlash", {{kFlash, kPortrait}}, {0, 1}},
    {"PortraitFlashAndLandscapeConversion",
     {{kFlash, kPortrait}, {kConversion, kLandscape}},
     {0, 2, {kConversion.name}}},
    {"PortraitFlashAndPortraitConversion", {{kFlash, kPortrait}, {kConversion, kPortrait}}, {1, 2}},
    // A conversion is not removed before there is a video for browsers.
    {"LandscapeFlashAndLandscapeConversion",
     {{kFlash, kLandscape}, {kConversion, kLandscape}},
     {0, 1, {kFlash.name}}},
};
const std::pair<Situation, std::vector<VideoCase>> kTables[] = {
    {{"WebUpright", IsWebVideoConverted, 0, kNoRecord}, kUprightWebCases},
    {{"WebUnreadable", IsWebVideoConverted, kUnreadable, kNoRecord}, kUnreadableWebCases},
    {{"WebRotated", IsWebVideoConverted, 90, kPortraitRecord}, kRotatedCases},
    {{"MobileUpright", IsMobileVideoConverted, 0, kNoRecord}, kUprightMobileCases},
    {{"MobileUnreadable", IsMobileVideoConverted, kUnreadable, kNoRecord}, kUnreadableMobileCases},
    {{"MobileRotated", IsMobileVideoConverted, 270, kPortraitRecord, "", kConversion, kFlash},
     kRotatedCases},
    {{"Upright", IsVideoConverted, 0, kGoodRecord}, kForWebOnlyCases},
    {{"UprightNotForMobile", IsVideoConverted, 0, kGoodRecord, kMobileNotWanted}, kForWebOnlyCases},
    {{"UprightForMobile", IsVideoConverted, 0, kGoodRecord, kMobileWanted}, kForMobileTooCases},
    {{"Rotated", IsVideoConverted, 90, kPortraitRecord}, kRotatedForWebOnlyCases},
    {{"RotatedForMobile", IsVideoConverted, 180, kPortraitRecord, kMobileWanted},
     kRotatedForMobileTooCases},
};

std::vector<std::tuple<Situation, VideoCase>> AllCases() {
  std::vector<std::tuple<Situation, VideoCase>> all;
  for (const auto& [situation, cases] : kTables) {
    for (const VideoCase& row : cases) {
      all.emplace_back(situation, row);
    }
  }
  return all;
}

INSTANTIATE_TEST_SUITE_P(Videos, VideoCases, ValuesIn(AllCases()),
                         [](const ::testing::TestParamInfo<VideoCases::ParamType>& row) {
                           return std::string(std::get<0>(row.param).name) +
                                  std::get<1>(row.param).name;
                         });

/// One of the two checks and the converted videos that it looks for.
struct VideoCheck : NamedCase {
  int (*isConverted)(const char* path);
  int rotation;  ///< that of the rotated video in its tests, degrees
  ConvertedVideo own;
  std::vector<ConvertedVideo> ofAnySize;      ///< accepted for upright videos, even when empty
  std::vector<ConvertedVideo> ofTwoBytes;     ///< accepted for upright videos from two bytes on
  std::vector<ConvertedVideo> withoutRecord;  ///< accepted before the daemon is asked
  std::vector<ConvertedVideo> byBitrate;      ///< accepted by the bitrate of the video
  std::vector<ConvertedVideo> useless;        ///< never accepted for upright videos
  int noPathLine;
  int noDirectoryLine;
};

const VideoCheck kWebCheck = {"Web",
                              IsWebVideoConverted,
                              90,
                              kFlash,
                              {},
                              {kHigh, kMedium, kLow, kMobile, kIphone, kFlash, kH264},
                              {kHigh, kMedium, kLow, kMobile, kIphone, kFlash},
                              {kH264},
                              {kMpeg4, kConversion},
                              460,
                              465};
const VideoCheck kMobileCheck = {"Mobile",
                                 IsMobileVideoConverted,
                                 270,
                                 kConversion,
                                 {kHigh, kMedium, kLow, kMobile},
                                 {kH264, kIphone, kMpeg4, kConversion},
                                 {kHigh, kMedium, kLow, kMobile},
                                 {kH264, kIphone},
                                 {kFlash},
                                 408,
                                 413};

class EitherCheck : public VideoCheckTest, public ::testing::WithParamInterface<VideoCheck> {
 protected:
  void PrepareVideo(int rotation, const char* record) {
    Prepare({"", GetParam().isConverted, rotation, record});
    SetRecord(record);
  }
};

TEST_P(EitherCheck, WithoutFilesAVideoIsNotConverted) {
  PrepareVideo(0, kGoodRecord);
  EXPECT_EQ(Check(), 0);
  RemoveTree(EaDir());
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_P(EitherCheck, SomeVideosMayBeOfAnySize) {
  PrepareVideo(0, kGoodRecord);
  for (const char* name : NamesOf(GetParam().ofAnySize)) {
    SCOPED_TRACE(name);
    MakeDerived(name, 0);
    EXPECT_EQ(Check(), 1);
    Remove(name);
  }
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_P(EitherCheck, SomeVideosNeedTwoBytes) {
  PrepareVideo(0, kGoodRecord);
  for (const char* name : NamesOf(GetParam().ofTwoBytes)) {
    SCOPED_TRACE(name);
    MakeDerived(name, 0);
    EXPECT_EQ(Check(), 0);
    MakeDerived(name, 1);
    EXPECT_EQ(Check(), 0);
    MakeDerived(name, 2);
    EXPECT_EQ(Check(), 1);
    EXPECT_THAT(Left(), ElementsAre(name));
    Remove(name);
  }
}

TEST_P(EitherCheck, NoRecordIsNeededBesideAVideoAcceptedWithoutOne) {
  PrepareVideo(0, kNoRecord);
  for (const ConvertedVideo& video : GetParam().byBitrate) {
    MakeDerived(video.name);
  }
  for (const ConvertedVideo& video : GetParam().withoutRecord) {
    SCOPED_TRACE(video.name);
    MakeDerived(video.name);
    EXPECT_EQ(Check(), 1);
    Remove(video.name);
  }
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_P(EitherCheck, SomeVideosAreUseless) {
  PrepareVideo(0, kGoodRecord);
  for (const char* name : NamesOf(GetParam().useless)) {
    MakeDerived(name);
  }
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_P(EitherCheck, TheQualityDependsOnTheBitrateOfTheVideo) {
  PrepareVideo(0, kGoodRecord);
  const struct {
    const char* bitrate;
    int isConverted;
  } cases[] = {{"0", 1},       {"1", 1},          {"4499999", 1},   {"4500000", 0},
               {"4500001", 0}, {"2147483648", 0}, {"4294967295", 0}};
  for (const ConvertedVideo& video : GetParam().byBitrate) {
    MakeDerived(video.name);
    for (const auto& c : cases) {
      SCOPED_TRACE(video.name + std::string(" of ") + c.bitrate);
      SetRecord(R"({"success":true,"media":{"bitrate":)" + std::string(c.bitrate) + "}}");
      EXPECT_EQ(Check(), c.isConverted);
    }
    Remove(video.name);
  }
  EXPECT_THAT(Requests(), SizeIs(7 * GetParam().byBitrate.size()));
  EXPECT_THAT(Requests(), Each(std::string(kMediaRequest)));
}

TEST_P(EitherCheck, AClosedConnectionFailsOneCheckOnly) {
  PrepareVideo(0, kGoodRecord);
  MakeDerived(kH264.name);
  Daemon().AnswerNext(DaemonReply::CloseAfterRequest());
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(TakeErrorLines(), SizeIs(2));
  EXPECT_EQ(Check(), 1);
}

TEST_P(EitherCheck, ARotatedVideoNeedsOneOfItsOrientation) {
  for (const int rotation : {90, 180, 270}) {
    SCOPED_TRACE(rotation);
    PrepareVideo(rotation, kPortraitRecord);
    for (const char* name : NamesOf(kOriented)) {
      SCOPED_TRACE(name);
      MakePortrait(name);
      EXPECT_EQ(Check(), 1);
      Remove(name);
      EXPECT_EQ(Check(), 0);
    }
  }
}

TEST_P(EitherCheck, AFileThatCannotBeRemovedChangesNothing) {
  PrepareVideo(GetParam().rotation, kPortraitRecord);
  MakeLandscape(GetParam().own.name);
  const ReadOnlyMount readOnly(EaDir());
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), ElementsAre(GetParam().own.name));
}

TEST_P(EitherCheck, RefusesANullPath) {
  EXPECT_EQ(GetParam().isConverted(nullptr), -1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_util:" + std::to_string(GetParam().noPathLine) +
                                            " Bad parameters."));
}

TEST_P(EitherCheck, RefusesAVideoWithoutMetadataDirectory) {
  for (const std::string& path : PathsWithoutDirectory()) {
    SCOPED_TRACE(path);
    EXPECT_EQ(GetParam().isConverted(path.c_str()), -1);
    const std::string expected = NoDirectoryLine(GetParam().noDirectoryLine, path);
    EXPECT_THAT(TakeErrorLines(), ElementsAre(expected));
  }
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_P(EitherCheck, AcceptsTheLongestPath) {
  const std::string path = PathOfLength(4088, "long.mp4");
  EXPECT_EQ(GetParam().isConverted(path.c_str()), 0);
  EXPECT_THAT(
      TakeErrorLines(),
      ElementsAre("velamk_util:213 Failed to get media metadata from file [" + path + "]."));
}

INSTANTIATE_TEST_SUITE_P(Videos, EitherCheck, Values(kWebCheck, kMobileCheck), CaseName());

class UprightVideo : public VideoCheckTest {
 protected:
  void SetUp() override {
    VideoCheckTest::SetUp();
    MakeVideo(0);
    SetRecord(kGoodRecord);
  }

  int IsForWeb() const { return IsWebVideoConverted(Media().c_str()); }
  int IsForMobile() const { return IsMobileVideoConverted(Media().c_str()); }
  int IsConverted() const { return IsVideoConverted(Media().c_str()); }
};

TEST_F(UprightVideo, AConvertedVideoMayBeHuge) {
  // Sizes whose low 32 bits are 0, 1 or a negative number.
  for (const off_t size : {off_t{1} << 32, (off_t{1} << 32) + 1, off_t{1} << 31}) {
    SCOPED_TRACE(size);
    ASSERT_EQ(truncate(MakeDerived(kLow.name).c_str(), size), 0);
    EXPECT_EQ(IsForWeb(), 1);
  }
}

TEST_F(UprightVideo, AMissingVideoIsCheckedAsAnUprightOne) {
  RemoveTree(Media());
  MakeDerived(kMedium.oldName, 2);
  EXPECT_EQ(IsForWeb(), 1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(kUnreadableVideo));
}

TEST_F(UprightVideo, Mpeg4VideosServeMobileDevicesAfterPoorOnes) {
  SetRecord(kPoorRecord);
  MakeDerived(kH264.name);
  MakeDerived(kIphone.name);
  for (const char* name : NamesOf({kMpeg4, kConversion})) {
    SCOPED_TRACE(name);
    MakeDerived(name, 1);
    EXPECT_EQ(IsForMobile(), 0);
    MakeDerived(name, 2);
    EXPECT_EQ(IsForMobile(), 1);
    Remove(name);
  }
}

TEST_F(UprightVideo, OnlyOneValueAsksForMobileVideos) {
  // A Flash video alone is not enough when mobile videos are wanted.
  MakeDerived(kFlash.name);
  const struct {
    const char* settings;
    int isConverted;
  } cases[] = {{"enable_mobile_video=\"yes\"\n", 0},
               {"enable_mobile_video=yes\n", 0},
               {"other=\"no\"\nenable_mobile_video = \"yes\"\n", 0},
               {"", 1},
               {"other=\"yes\"\n", 1},
               {"enable_mobile_video=\"no\"\n", 1},
               {"enable_mobile_video=\"YES\"\n", 1},
               {"enable_mobile_video=\"Yes\"\n", 1},
               {"enable_mobile_video=\"\"\n", 1},
               {"enable_mobile_video=\"yes please\"\n", 1},
               {"enable_mobile_video=\"1\"\n", 1},
               {"ENABLE_MOBILE_VIDEO=\"yes\"\n", 1},
               {"#enable_mobile_video=\"yes\"\n", 1}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.settings);
    WriteFile(kSettings, c.settings);
    EXPECT_EQ(IsConverted(), c.isConverted);
  }
  RemoveTree(kSettings);
  EXPECT_EQ(IsConverted(), 1);
}

TEST_F(UprightVideo, TheSettingIsReadBeforeTheChecks) {
  MakeDerived(kH264.name);
  const auto changeTo = [](const char* settings) {
    return DaemonReply::Line(kGoodRecord).Meanwhile([settings](const DaemonRequest&) {
      WriteFile(kSettings, settings);
    });
  };
  Daemon().AnswerNext(changeTo(kMobileWanted));
  EXPECT_EQ(IsConverted(), 1);
  EXPECT_EQ(RequestCount(), 1U);

  Daemon().AnswerNext(changeTo(kMobileNotWanted));
  SetRecord(kPoorRecord);
  EXPECT_EQ(IsConverted(), 0);
  EXPECT_EQ(RequestCount(), 3U);
}

TEST_F(UprightVideo, EachCheckReportsAnUnreadableVideo) {
  WriteFile(Media(), "no film");
  MakeDerived(kHigh.name);
  EXPECT_EQ(IsConverted(), 1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(kUnreadableVideo));
  WriteFile(kSettings, kMobileWanted);
  EXPECT_EQ(IsConverted(), 1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(kUnreadableVideo, kUnreadableVideo));
  Remove(kHigh.name);
  EXPECT_EQ(IsConverted(), 0);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(kUnreadableVideo));
}

TEST_F(UprightVideo, BothChecksRefuseANullPathAtOnce) {
  WriteFile(kSettings, kMobileWanted);
  EXPECT_EQ(IsVideoConverted(nullptr), -1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_util:509 Bad parameters."));
}

TEST_F(UprightVideo, CountsAsConvertedWithoutMetadataDirectory) {
  for (const std::string& path : PathsWithoutDirectory()) {
    SCOPED_TRACE(path);
    RemoveTree(kSettings);
    EXPECT_EQ(IsVideoConverted(path.c_str()), 1);
    const std::string web = NoDirectoryLine(465, path);
    EXPECT_THAT(TakeErrorLines(), ElementsAre(web));

    WriteFile(kSettings, kMobileWanted);
    EXPECT_EQ(IsVideoConverted(path.c_str()), 1);
    const std::string mobile = NoDirectoryLine(413, path);
    EXPECT_THAT(TakeErrorLines(), ElementsAre(web, mobile));
  }
  EXPECT_EQ(RequestCount(), 0U);
}

}  // namespace
}  // namespace vela_test
