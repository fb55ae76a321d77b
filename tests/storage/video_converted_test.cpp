// Whether a video has all the films that the settings ask for.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "storage/velamk_util.h"
#include "storage/video_fixture.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;

constexpr const char* kSettings = "/etc/velainfo.conf";
constexpr const char* kMobileWanted = "enable_mobile_video=\"yes\"\n";
constexpr const char* kMobileNotWanted = "enable_mobile_video=\"no\"\n";

class VideoConverted : public VideoTest {
 protected:
  void SetUp() override {
    VideoTest::SetUp();
    MakeVideo(0);
    SetRecord(kGoodRecord);
  }

  int Check() const { return IsVideoConverted(Media().c_str()); }
};

TEST_F(VideoConverted, WithoutFilmsItIsNot) {
  EXPECT_EQ(Check(), 0);
  WriteFile(kSettings, kMobileWanted);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoConverted, AFilmOfTheOlderNameNeedsTwoBytes) {
  MakeDerived(kMedium.oldName, 1);
  EXPECT_EQ(Check(), 0);
  MakeDerived(kMedium.oldName, 2);
  EXPECT_EQ(Check(), 1);
}

TEST_F(VideoConverted, AHighFilmServesMobileDevicesToo) {
  MakeDerived(kHigh.name);
  EXPECT_EQ(Check(), 1);
  WriteFile(kSettings, kMobileWanted);
  EXPECT_EQ(Check(), 1);
}

TEST_F(VideoConverted, AFlashFilmDoesNotServeMobileDevices) {
  MakeDerived(kFlash.name);
  EXPECT_EQ(Check(), 1);
  WriteFile(kSettings, kMobileWanted);
  EXPECT_EQ(Check(), 0);
  MakeDerived(kMpeg4.name);
  EXPECT_EQ(Check(), 1);
}

TEST_F(VideoConverted, AFilmForMobileDevicesAloneIsNotEnough) {
  MakeDerived(kMpeg4.name);
  MakeDerived(kConversion.name);
  EXPECT_EQ(Check(), 0);
  WriteFile(kSettings, kMobileWanted);
  EXPECT_EQ(Check(), 0);
}

TEST_F(VideoConverted, MobileFilmsAreWantedByOneValueOnly) {
  // With a Flash film alone, 0 tells that mobile films are wanted.
  MakeDerived(kFlash.name);
  for (const char* settings : {"enable_mobile_video=\"yes\"\n", "enable_mobile_video=yes\n",
                               "other=\"no\"\n"
                               "enable_mobile_video = \"yes\"\n"}) {
    SCOPED_TRACE(settings);
    WriteFile(kSettings, settings);
    EXPECT_EQ(Check(), 0);
  }
  for (const char* settings :
       {"", "other=\"yes\"\n", "enable_mobile_video=\"no\"\n", "enable_mobile_video=\"YES\"\n",
        "enable_mobile_video=\"Yes\"\n", "enable_mobile_video=\"\"\n",
        "enable_mobile_video=\"yes please\"\n", "enable_mobile_video=\"1\"\n",
        "ENABLE_MOBILE_VIDEO=\"yes\"\n", "#enable_mobile_video=\"yes\"\n"}) {
    SCOPED_TRACE(settings);
    WriteFile(kSettings, settings);
    EXPECT_EQ(Check(), 1);
  }
  RemoveTree(kSettings);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoConverted, TheH264FilmIsJudgedByBothChecks) {
  WriteFile(kSettings, kMobileWanted);
  MakeDerived(kH264.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_EQ(RequestCount(), 2U);
  // The record may change from one check to the next.
  SetNextRecord(kGoodRecord);
  SetNextRecord(kPoorRecord);
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 4U);
}

TEST_F(VideoConverted, WithoutAWebFilmMobileFilmsAreNotLookedAt) {
  WriteFile(kSettings, kMobileWanted);
  MakeDerived(kH264.name);
  SetRecord(kNoRecord);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(),
              ElementsAre(kDaemonFailed,
                          "velamk_util:243 fail to get media from plugin db: /tmp/media/film.mp4"));
  EXPECT_EQ(RequestCount(), 1U);
}

TEST_F(VideoConverted, TheRecordMayFailForTheMobileCheckOnly) {
  WriteFile(kSettings, kMobileWanted);
  MakeDerived(kIphone.name);
  SetRecord(kNoRecord);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(),
              ElementsAre(kDaemonFailed,
                          "velamk_util:357 fail to get media from plugin db: /tmp/media/film.mp4"));
}

TEST_F(VideoConverted, MobileFilmsThatAreNotWantedAreNotLookedAt) {
  WriteFile(kSettings, kMobileNotWanted);
  MakeDerived(kH264.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_EQ(RequestCount(), 1U);
}

TEST_F(VideoConverted, TheSettingIsReadBeforeTheChecks) {
  MakeDerived(kH264.name);
  const auto changeTo = [](const char* settings) {
    return DaemonReply::Line(kGoodRecord).Meanwhile([settings](const DaemonRequest&) {
      WriteFile(kSettings, settings);
    });
  };
  Daemon().AnswerNext(changeTo(kMobileWanted));
  EXPECT_EQ(Check(), 1);
  EXPECT_EQ(RequestCount(), 1U);

  Daemon().AnswerNext(changeTo(kMobileNotWanted));
  SetRecord(kPoorRecord);
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 3U);
}

TEST_F(VideoConverted, AnUnreadableVideoIsReportedByEachCheck) {
  WriteFile(Media(), "no film");
  MakeDerived(kHigh.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadableVideo));
  ClearLog();
  WriteFile(kSettings, kMobileWanted);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadableVideo, kUnreadableVideo));
  ClearLog();
  Remove(kHigh.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadableVideo));
}

TEST_F(VideoConverted, ALandscapeFlashFilmOfARotatedPortraitIsGoneAfterwards) {
  MakeVideo(90);
  SetRecord(kPortraitRecord);
  MakeLandscape(kFlash.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), IsEmpty());
}

TEST_F(VideoConverted, ARotatedVideoNeedsMatchingFilmsForBoth) {
  WriteFile(kSettings, kMobileWanted);
  MakeVideo(180);
  SetRecord(kPortraitRecord);
  MakePortrait(kFlash.name);
  EXPECT_EQ(Check(), 0);
  MakeLandscape(kConversion.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), ElementsAre(kFlash.name));
  MakePortrait(kConversion.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), SizeIs(2));
}

TEST_F(VideoConverted, AConversionIsNotCleanedBeforeThereIsAWebFilm) {
  WriteFile(kSettings, kMobileWanted);
  MakeVideo(90);
  SetRecord(kPortraitRecord);
  MakeLandscape(kFlash.name);
  MakeLandscape(kConversion.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), ElementsAre(kConversion.name));
}

TEST_F(VideoConverted, AConversionThatIsNotWantedIsNotCleaned) {
  MakeVideo(90);
  SetRecord(kPortraitRecord);
  MakePortrait(kFlash.name);
  MakeLandscape(kConversion.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), UnorderedElementsAre(kFlash.name, kConversion.name));
}

TEST_F(VideoConverted, NoPathIsRefused) {
  WriteFile(kSettings, kMobileWanted);
  EXPECT_EQ(IsVideoConverted(nullptr), -1);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_util:509 Bad parameters."));
}

TEST_F(VideoConverted, AVideoWithoutMetadataDirectoryCountsAsConverted) {
  for (const std::string& path : PathsWithoutDirectory()) {
    SCOPED_TRACE(path);
    ClearLog();
    RemoveTree(kSettings);
    EXPECT_EQ(IsVideoConverted(path.c_str()), 1);
    const std::string web = NoDirectoryLine(465, path);
    EXPECT_THAT(ErrorLines(), ElementsAre(web));

    ClearLog();
    WriteFile(kSettings, kMobileWanted);
    EXPECT_EQ(IsVideoConverted(path.c_str()), 1);
    const std::string mobile = NoDirectoryLine(413, path);
    EXPECT_THAT(ErrorLines(), ElementsAre(web, mobile));
  }
  EXPECT_EQ(RequestCount(), 0U);
}

}  // namespace
}  // namespace vela_test
