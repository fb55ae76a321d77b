// Whether a video has a film for mobile devices.
#include <gmock/gmock.h>

#include <string>

#include "storage/velamk_util.h"
#include "storage/video_fixture.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

constexpr const char* kUnknownH264Quality =
    "velamk_util:344 fail to get media from plugin db: /tmp/media/film.mp4";
constexpr const char* kUnknownIphoneQuality =
    "velamk_util:357 fail to get media from plugin db: /tmp/media/film.mp4";

class MobileVideo : public VideoTest {
 protected:
  int Check() const { return IsMobileVideoConverted(Media().c_str()); }
};

/// A video that is shown as it is stored.
class UprightMobileVideo : public MobileVideo {
 protected:
  void SetUp() override {
    MobileVideo::SetUp();
    MakeVideo(0);
    SetRecord(kGoodRecord);
  }
};

TEST_F(UprightMobileVideo, WithoutFilmsIsNotConverted) {
  EXPECT_EQ(Check(), 0);
  RemoveTree(EaDir());
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(UprightMobileVideo, HasAnyFilmMadeInItsOrientation) {
  for (const Film& film : kTurnedFilms) {
    for (const char* name : {film.name, film.oldName}) {
      SCOPED_TRACE(name);
      // That it exists is enough here.
      MakeDerived(name, 0);
      EXPECT_EQ(Check(), 1);
      Remove(name);
    }
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(UprightMobileVideo, HasAnotherFilmOfTwoBytes) {
  for (const Film& film : {kH264, kIphone, kMpeg4, kConversion}) {
    for (const char* name : {film.name, film.oldName}) {
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
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(UprightMobileVideo, IsNotConvertedByAFlashFilm) {
  MakeDerived(kFlash.name);
  MakeDerived(kFlash.oldName);
  EXPECT_EQ(Check(), 0);
}

TEST_F(UprightMobileVideo, NeedsNoRecordBesideAFilmMadeInItsOrientation) {
  SetRecord(kNoRecord);
  MakeDerived(kH264.name);
  MakeDerived(kIphone.name);
  for (const Film& film : kTurnedFilms) {
    SCOPED_TRACE(film.name);
    MakeDerived(film.name);
    EXPECT_EQ(Check(), 1);
    Remove(film.name);
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(UprightMobileVideo, TheQualityIsThatOfTheVideo) {
  for (const Film& film : {kH264, kIphone}) {
    MakeDerived(film.name);
    for (const char* bitrate : {"0", "4499999"}) {
      SCOPED_TRACE(film.name + std::string(" of ") + bitrate);
      SetBitrate(bitrate);
      EXPECT_EQ(Check(), 1);
    }
    for (const char* bitrate : {"4500000", "2147483648", "4294967295"}) {
      SCOPED_TRACE(film.name + std::string(" of ") + bitrate);
      SetBitrate(bitrate);
      EXPECT_EQ(Check(), 0);
    }
    Remove(film.name);
  }
  for (const DaemonRequest& request : Daemon().Requests()) {
    EXPECT_EQ(request.bytes,
              "{\"command\":\"GET_MEDIA_FROM_PLUGIN_DB\",\"path\":\"/tmp/media/film.mp4\","
              "\"type\":1}\n");
  }
  EXPECT_EQ(RequestCount(), 10U);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(UprightMobileVideo, AGoodH264FilmEndsTheSearch) {
  for (const Film& film : {kH264, kIphone, kMpeg4, kConversion}) {
    MakeDerived(film.name);
  }
  EXPECT_EQ(Check(), 1);
  EXPECT_EQ(RequestCount(), 1U);
}

TEST_F(UprightMobileVideo, AfterAPoorH264FilmTheIphoneFilmIsJudgedAnew) {
  MakeDerived(kH264.name);
  MakeDerived(kIphone.name);
  SetNextRecord(kPoorRecord);
  EXPECT_EQ(Check(), 1);
  EXPECT_EQ(RequestCount(), 2U);

  SetRecord(kPoorRecord);
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 4U);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(UprightMobileVideo, AnH264FilmThatIsTooSmallIsNotJudged) {
  MakeDerived(kH264.name, 1);
  MakeDerived(kIphone.name);
  SetRecord(kNoRecord);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownIphoneQuality));
}

TEST_F(UprightMobileVideo, AfterPoorFilmsTheMpeg4FilmsCount) {
  SetRecord(kPoorRecord);
  MakeDerived(kH264.name);
  MakeDerived(kIphone.name);
  for (const Film& film : {kMpeg4, kConversion}) {
    for (const char* name : {film.name, film.oldName}) {
      SCOPED_TRACE(name);
      MakeDerived(name, 1);
      EXPECT_EQ(Check(), 0);
      MakeDerived(name, 2);
      EXPECT_EQ(Check(), 1);
      Remove(name);
    }
  }
}

TEST_F(UprightMobileVideo, TheMpeg4FilmsComeAfterTheJudgedOnes) {
  SetRecord(kNoRecord);
  MakeDerived(kMpeg4.name);
  MakeDerived(kConversion.name);
  MakeDerived(kIphone.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownIphoneQuality));
  ClearLog();
  MakeDerived(kH264.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownH264Quality));
}

TEST_F(UprightMobileVideo, WithoutARecordForTheH264FilmTheIphoneFilmIsNotLookedAt) {
  MakeDerived(kH264.name);
  MakeDerived(kIphone.name);
  SetNextRecord(kNoRecord);
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 1U);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownH264Quality));

  for (const Film& film : {kMpeg4, kConversion}) {
    SCOPED_TRACE(film.name);
    SetNextRecord(kNoRecord);
    MakeDerived(film.name, 2);
    EXPECT_EQ(Check(), 1);
    Remove(film.name);
  }
  EXPECT_EQ(RequestCount(), 3U);
}

TEST_F(UprightMobileVideo, WithoutARecordTheIphoneFilmIsNotGoodEnough) {
  MakeDerived(kIphone.oldName);
  SetRecord(R"({"success":false,"media":{"bitrate":1}})");
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownIphoneQuality));
}

TEST_F(UprightMobileVideo, TheRecordMayFailForTheIphoneFilmOnly) {
  MakeDerived(kH264.name);
  MakeDerived(kIphone.name);
  SetNextRecord(kPoorRecord);
  Daemon().AnswerNext(DaemonReply::CloseAfterRequest());
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 2U);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownIphoneQuality));
}

TEST_F(UprightMobileVideo, WithoutADaemonOnlyTheMpeg4FilmsCount) {
  StopDaemon();
  MakeDerived(kH264.name);
  MakeDerived(kIphone.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownH264Quality));
  ClearLog();
  Remove(kH264.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownIphoneQuality));
  MakeDerived(kMpeg4.name);
  EXPECT_EQ(Check(), 1);
}

TEST_F(UprightMobileVideo, TheOrientationOfItsFilmsDoesNotMatter) {
  SetRecord(kLandscapeRecord);
  MakePortrait(kConversion.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), ElementsAre(kConversion.name));
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(MobileVideo, AnUnreadableVideoCountsAsUpright) {
  WriteFile(Media(), "no film");
  MakePortrait(kConversion.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), ElementsAre(kConversion.name));
  EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadableVideo));
  ClearLog();

  SetRecord(kNoRecord);
  MakeDerived(kIphone.name);
  Remove(kConversion.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadableVideo, kDaemonFailed, kUnknownIphoneQuality));
}

TEST_F(MobileVideo, ARotatedVideoHasAFilmOfItsOrientation) {
  MakePortrait("made.mp4");
  SetRecord(kPortraitRecord);
  for (const int rotation : {90, 180, 270}) {
    SCOPED_TRACE(rotation);
    MakeVideo(rotation);
    for (const Film& film : kTurnedFilms) {
      for (const char* name : {film.name, film.oldName}) {
        SCOPED_TRACE(name);
        CopyFile(Derived("made.mp4"), Derived(name));
        EXPECT_EQ(Check(), 1);
        Remove(name);
        EXPECT_EQ(Check(), 0);
      }
    }
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

/// A video to be turned by 270 degrees; its record is portrait.
class RotatedMobileVideo : public MobileVideo {
 protected:
  void SetUp() override {
    MobileVideo::SetUp();
    MakeVideo(270);
    SetRecord(kPortraitRecord);
  }
};

TEST_F(RotatedMobileVideo, WithoutFilmsIsNotConverted) {
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(RotatedMobileVideo, IsNotConvertedByFilmsOfTheOtherOrientation) {
  MakeLandscape("made.mp4");
  for (const Film& film : kTurnedFilms) {
    CopyFile(Derived("made.mp4"), Derived(film.name));
    CopyFile(Derived("made.mp4"), Derived(film.oldName));
  }
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 4U);
  EXPECT_EQ(Left().size(), 9U);
}

TEST_F(RotatedMobileVideo, IsNeverConvertedByTheOtherFilms) {
  SetRecord(R"({"success":true,"media":{"width":480,"height":640,"bitrate":1}})");
  for (const Film& film : {kH264, kIphone, kMpeg4, kFlash}) {
    MakePortrait(film.name);
    MakePortrait(film.oldName);
  }
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 0U);
  EXPECT_EQ(Left().size(), 8U);
}

TEST_F(RotatedMobileVideo, KeepsAConversionOfItsOrientation) {
  for (const char* name : {kConversion.name, kConversion.oldName}) {
    SCOPED_TRACE(name);
    MakePortrait(name);
    EXPECT_EQ(Check(), 1);
    EXPECT_THAT(Left(), ElementsAre(name));
    Remove(name);
  }
}

TEST_F(RotatedMobileVideo, LosesAConversionOfTheOtherOrientation) {
  for (const char* name : {kConversion.name, kConversion.oldName}) {
    SCOPED_TRACE(name);
    MakeLandscape(name);
    EXPECT_EQ(Check(), 0);
    EXPECT_THAT(Left(), IsEmpty());
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RotatedMobileVideo, LosesTheConversionUnderBothNames) {
  MakeLandscape(kConversion.name);
  MakePortrait(kConversion.oldName);
  MakeDerived(kMpeg4.name);
  MakeLandscape(kFlash.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), UnorderedElementsAre(kMpeg4.name, kFlash.name));
}

TEST_F(RotatedMobileVideo, KeepsBothConversionsWhenTheCurrentOneMatches) {
  MakePortrait(kConversion.name);
  MakeLandscape(kConversion.oldName);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), UnorderedElementsAre(kConversion.name, kConversion.oldName));
}

TEST_F(RotatedMobileVideo, AConversionThatCannotBeReadIsLandscape) {
  MakeDerived(kConversion.name, 0);
  SetRecord(kLandscapeRecord);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), ElementsAre(kConversion.name));
  SetRecord(kPortraitRecord);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), IsEmpty());
}

TEST_F(RotatedMobileVideo, AConversionHelpsWhereTheOtherFilmsDoNotMatch) {
  MakeLandscape(kLow.name);
  MakePortrait(kConversion.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_EQ(RequestCount(), 2U);
  EXPECT_THAT(Left(), UnorderedElementsAre(kLow.name, kConversion.name));
}

TEST_F(RotatedMobileVideo, AMatchingFilmLeavesTheConversionAlone) {
  MakePortrait(kHigh.oldName);
  MakeLandscape(kConversion.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_EQ(RequestCount(), 1U);
  EXPECT_THAT(Left(), UnorderedElementsAre(kHigh.oldName, kConversion.name));
}

TEST_F(RotatedMobileVideo, AConversionThatCannotBeRemovedChangesNothing) {
  MakeLandscape(kConversion.name);
  const ReadOnlyMount readOnly(EaDir());
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), ElementsAre(kConversion.name));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RotatedMobileVideo, WithoutRecordsCountsAsLandscape) {
  SetRecord(kNoRecord);
  MakePortrait(kMobile.name);
  MakePortrait(kConversion.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), ElementsAre(kMobile.name));
  EXPECT_THAT(ErrorLines(),
              ElementsAre(kDaemonFailed, kUnknownOrientation, kDaemonFailed, kUnknownOrientation));
  MakeLandscape(kConversion.name);
  EXPECT_EQ(Check(), 1);
}

TEST_F(RotatedMobileVideo, AFailureOfTheDaemonCostsOneFilmOnly) {
  SetNextRecord(kNoRecord);
  MakePortrait(kHigh.name);
  MakePortrait(kConversion.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), UnorderedElementsAre(kHigh.name, kConversion.name));
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownOrientation));

  SetNextRecord(kPortraitRecord);
  SetNextRecord(kNoRecord);
  MakeLandscape(kHigh.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), ElementsAre(kHigh.name));
}

TEST_F(MobileVideo, NoPathIsRefused) {
  EXPECT_EQ(IsMobileVideoConverted(nullptr), -1);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_util:408 Bad parameters."));
}

TEST_F(MobileVideo, AVideoWithoutMetadataDirectoryIsRefused) {
  for (const std::string& path : PathsWithoutDirectory()) {
    SCOPED_TRACE(path);
    ClearLog();
    EXPECT_EQ(IsMobileVideoConverted(path.c_str()), -1);
    const std::string expected = NoDirectoryLine(413, path);
    EXPECT_THAT(ErrorLines(), ElementsAre(expected));
  }
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(MobileVideo, TheLongestPathIsChecked) {
  const std::string path = PathOfLength(4088, "long.mp4");
  EXPECT_EQ(IsMobileVideoConverted(path.c_str()), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_util:213 Failed to get media metadata from file [" +
                                        path + "]."));
}

}  // namespace
}  // namespace vela_test
