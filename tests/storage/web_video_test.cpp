// Whether a video has a film for browsers.
#include <gmock/gmock.h>
#include <unistd.h>

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

constexpr const char* kUnknownQuality =
    "velamk_util:243 fail to get media from plugin db: /tmp/media/film.mp4";

class WebVideo : public VideoTest {
 protected:
  int Check() const { return IsWebVideoConverted(Media().c_str()); }
};

/// A video that is shown as it is stored.
class UprightWebVideo : public WebVideo {
 protected:
  void SetUp() override {
    WebVideo::SetUp();
    MakeVideo(0);
    SetRecord(kGoodRecord);
  }
};

TEST_F(UprightWebVideo, WithoutFilmsIsNotConverted) {
  EXPECT_EQ(Check(), 0);
  RemoveTree(EaDir());
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(UprightWebVideo, HasAFilmOfTwoBytes) {
  for (const Film& film : {kHigh, kMedium, kLow, kMobile, kIphone, kFlash, kH264}) {
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

TEST_F(UprightWebVideo, NeedsNoRecordBesideTheOtherFilms) {
  SetRecord(kNoRecord);
  for (const Film& film : {kHigh, kMedium, kLow, kMobile, kIphone, kFlash}) {
    SCOPED_TRACE(film.name);
    MakeDerived(film.name);
    MakeDerived(kH264.name);
    EXPECT_EQ(Check(), 1);
    Remove(film.name);
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(UprightWebVideo, IsNotConvertedByFilmsForMobileDevices) {
  for (const Film& film : {kMpeg4, kConversion}) {
    MakeDerived(film.name);
    MakeDerived(film.oldName);
  }
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(UprightWebVideo, TheSizeIsThatOfTheCurrentName) {
  MakeDerived(kHigh.name, 1);
  MakeDerived(kHigh.oldName, 10);
  EXPECT_EQ(Check(), 0);
  MakeDerived(kHigh.name, 2);
  MakeDerived(kHigh.oldName, 0);
  EXPECT_EQ(Check(), 1);
}

TEST_F(UprightWebVideo, ATooSmallFilmDoesNotHideALaterOne) {
  MakeDerived(kHigh.name, 1);
  MakeDerived(kIphone.name, 0);
  EXPECT_EQ(Check(), 0);
  MakeDerived(kFlash.oldName, 2);
  EXPECT_EQ(Check(), 1);
}

TEST_F(UprightWebVideo, AFilmMayBeHuge) {
  // Sizes of which 32 bits leave 0, 1 or a negative number.
  for (const off_t size : {off_t{1} << 32, (off_t{1} << 32) + 1, off_t{1} << 31}) {
    SCOPED_TRACE(size);
    ASSERT_EQ(truncate(MakeDerived(kLow.name).c_str(), size), 0);
    EXPECT_EQ(Check(), 1);
  }
}

TEST_F(UprightWebVideo, TheH264FilmOfAVideoOfManyBitsIsNotGoodEnough) {
  MakeDerived(kH264.name);
  for (const char* bitrate : {"0", "1", "4499999"}) {
    SCOPED_TRACE(bitrate);
    SetBitrate(bitrate);
    EXPECT_EQ(Check(), 1);
  }
  for (const char* bitrate : {"4500000", "4500001", "2147483648", "4294967295"}) {
    SCOPED_TRACE(bitrate);
    SetBitrate(bitrate);
    EXPECT_EQ(Check(), 0);
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(UprightWebVideo, OnlyTheBitrateTellsTheQuality) {
  MakeDerived(kH264.name);
  SetRecord(R"({"success":true,"media":{"width":5000000,"height":5000000,"size":5000000,)"
            R"("duration":5000000,"mtime":5000000}})");
  EXPECT_EQ(Check(), 1);
}

TEST_F(UprightWebVideo, TheQualityIsAskedForOnce) {
  MakeDerived(kH264.name);
  SetRecord(kPoorRecord);
  EXPECT_EQ(Check(), 0);
  ASSERT_EQ(RequestCount(), 1U);
  EXPECT_EQ(Daemon().Requests().front().bytes,
            "{\"command\":\"GET_MEDIA_FROM_PLUGIN_DB\",\"path\":\"/tmp/media/film.mp4\","
            "\"type\":1}\n");
  EXPECT_THAT(Left(), ElementsAre(kH264.name));
}

TEST_F(UprightWebVideo, WithoutARecordTheH264FilmIsNotGoodEnough) {
  MakeDerived(kH264.name);
  SetRecord(R"({"success":false,"media":{"bitrate":1}})");
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownQuality));
}

TEST_F(UprightWebVideo, ADaemonThatClosesGivesNoRecord) {
  MakeDerived(kH264.name);
  Daemon().AnswerNext(DaemonReply::CloseAfterRequest());
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownQuality));
  EXPECT_EQ(Check(), 1);
}

TEST_F(UprightWebVideo, WithoutADaemonTheH264FilmIsNotGoodEnough) {
  StopDaemon();
  MakeDerived(kH264.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownQuality));
  MakeDerived(kFlash.name);
  EXPECT_EQ(Check(), 1);
}

TEST_F(UprightWebVideo, TheOrientationOfItsFilmsDoesNotMatter) {
  SetRecord(kLandscapeRecord);
  MakePortrait(kFlash.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), ElementsAre(kFlash.name));
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(WebVideo, AnUnreadableVideoCountsAsUpright) {
  WriteFile(Media(), "no film");
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadableVideo));
  ClearLog();

  SetRecord(kNoRecord);
  MakeDerived(kH264.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadableVideo, kDaemonFailed, kUnknownQuality));
  ClearLog();

  SetRecord(kLandscapeRecord);
  MakePortrait(kFlash.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), UnorderedElementsAre(kFlash.name, kH264.name));
  EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadableVideo));
}

TEST_F(WebVideo, TheFilmsOfAMissingVideoCount) {
  RemoveTree(Media());
  MakeDerived(kMedium.oldName, 2);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadableVideo));
}

TEST_F(WebVideo, ARotatedVideoHasAFilmOfItsOrientation) {
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

/// A video to be turned by 90 degrees; its record is portrait.
class RotatedWebVideo : public WebVideo {
 protected:
  void SetUp() override {
    WebVideo::SetUp();
    MakeVideo(90);
    SetRecord(kPortraitRecord);
  }
};

TEST_F(RotatedWebVideo, WithoutFilmsIsNotConverted) {
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(RotatedWebVideo, IsNotConvertedByFilmsOfTheOtherOrientation) {
  MakeLandscape("made.mp4");
  for (const Film& film : kTurnedFilms) {
    CopyFile(Derived("made.mp4"), Derived(film.name));
    CopyFile(Derived("made.mp4"), Derived(film.oldName));
  }
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 4U);
  EXPECT_EQ(Left().size(), 9U);
}

TEST_F(RotatedWebVideo, IsJudgedByItsRecord) {
  MakeLandscape(kLow.name);
  EXPECT_EQ(Check(), 0);
  SetRecord(kLandscapeRecord);
  EXPECT_EQ(Check(), 1);
}

TEST_F(RotatedWebVideo, IsNeverConvertedByTheOtherFilms) {
  SetRecord(R"({"success":true,"media":{"width":480,"height":640,"bitrate":1}})");
  for (const Film& film : {kH264, kIphone, kMpeg4, kConversion}) {
    MakePortrait(film.name);
    MakePortrait(film.oldName);
  }
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(RequestCount(), 0U);
  EXPECT_EQ(Left().size(), 8U);
}

TEST_F(RotatedWebVideo, AFilmMayBeOfAnySize) {
  // An empty film is landscape, for it cannot be read.
  MakeDerived(kMedium.name, 0);
  EXPECT_EQ(Check(), 0);
  SetRecord(kLandscapeRecord);
  EXPECT_EQ(Check(), 1);
}

TEST_F(RotatedWebVideo, KeepsAFlashFilmOfItsOrientation) {
  for (const char* name : {kFlash.name, kFlash.oldName}) {
    SCOPED_TRACE(name);
    MakePortrait(name);
    EXPECT_EQ(Check(), 1);
    EXPECT_THAT(Left(), ElementsAre(name));
    Remove(name);
  }
}

TEST_F(RotatedWebVideo, LosesAFlashFilmOfTheOtherOrientation) {
  for (const char* name : {kFlash.name, kFlash.oldName}) {
    SCOPED_TRACE(name);
    MakeLandscape(name);
    EXPECT_EQ(Check(), 0);
    EXPECT_THAT(Left(), IsEmpty());
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RotatedWebVideo, LosesTheFlashFilmUnderBothNames) {
  MakeLandscape(kFlash.name);
  MakePortrait(kFlash.oldName);
  MakeDerived(kH264.name);
  MakeLandscape(kLow.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), UnorderedElementsAre(kH264.name, kLow.name));
}

TEST_F(RotatedWebVideo, KeepsBothFlashFilmsWhenTheCurrentOneMatches) {
  MakePortrait(kFlash.name);
  MakeLandscape(kFlash.oldName);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), UnorderedElementsAre(kFlash.name, kFlash.oldName));
}

TEST_F(RotatedWebVideo, AFlashFilmThatCannotBeReadIsLandscape) {
  MakeDerived(kFlash.name, 0);
  SetRecord(kLandscapeRecord);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), ElementsAre(kFlash.name));
  SetRecord(kPortraitRecord);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), IsEmpty());
}

TEST_F(RotatedWebVideo, AFlashFilmHelpsWhereTheOtherFilmsDoNotMatch) {
  MakeLandscape(kHigh.name);
  MakePortrait(kFlash.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_EQ(RequestCount(), 2U);
  EXPECT_THAT(Left(), UnorderedElementsAre(kHigh.name, kFlash.name));
}

TEST_F(RotatedWebVideo, AMatchingFilmLeavesTheFlashFilmAlone) {
  MakePortrait(kMobile.oldName);
  MakeLandscape(kFlash.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_EQ(RequestCount(), 1U);
  EXPECT_THAT(Left(), UnorderedElementsAre(kMobile.oldName, kFlash.name));
}

TEST_F(RotatedWebVideo, AFlashFilmThatCannotBeRemovedChangesNothing) {
  MakeLandscape(kFlash.name);
  const ReadOnlyMount readOnly(EaDir());
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), ElementsAre(kFlash.name));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RotatedWebVideo, WithoutRecordsCountsAsLandscape) {
  SetRecord(kNoRecord);
  MakePortrait(kHigh.name);
  MakePortrait(kFlash.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), ElementsAre(kHigh.name));
  EXPECT_THAT(ErrorLines(),
              ElementsAre(kDaemonFailed, kUnknownOrientation, kDaemonFailed, kUnknownOrientation));
  ClearLog();
  MakeLandscape(kFlash.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(ErrorLines(),
              ElementsAre(kDaemonFailed, kUnknownOrientation, kDaemonFailed, kUnknownOrientation));
}

TEST_F(RotatedWebVideo, WithoutADaemonCountsAsLandscape) {
  StopDaemon();
  MakePortrait(kFlash.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownOrientation));
}

TEST_F(RotatedWebVideo, AFailureOfTheDaemonCostsOneFilmOnly) {
  SetNextRecord(kNoRecord);
  MakePortrait(kHigh.name);
  MakePortrait(kFlash.name);
  EXPECT_EQ(Check(), 1);
  EXPECT_THAT(Left(), UnorderedElementsAre(kHigh.name, kFlash.name));
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownOrientation));

  SetNextRecord(kPortraitRecord);
  SetNextRecord(kNoRecord);
  MakeLandscape(kHigh.name);
  EXPECT_EQ(Check(), 0);
  EXPECT_THAT(Left(), ElementsAre(kHigh.name));
}

TEST_F(WebVideo, NoPathIsRefused) {
  EXPECT_EQ(IsWebVideoConverted(nullptr), -1);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_util:460 Bad parameters."));
}

TEST_F(WebVideo, AVideoWithoutMetadataDirectoryIsRefused) {
  for (const std::string& path : PathsWithoutDirectory()) {
    SCOPED_TRACE(path);
    ClearLog();
    EXPECT_EQ(IsWebVideoConverted(path.c_str()), -1);
    const std::string expected = NoDirectoryLine(465, path);
    EXPECT_THAT(ErrorLines(), ElementsAre(expected));
  }
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(WebVideo, TheLongestPathIsChecked) {
  const std::string path = PathOfLength(4088, "long.mp4");
  EXPECT_EQ(IsWebVideoConverted(path.c_str()), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_util:213 Failed to get media metadata from file [" +
                                        path + "]."));
}

}  // namespace
}  // namespace vela_test
