// Whether a video is turned, and whether its films stand as it does.
#include <gmock/gmock.h>

#include <string>

#include "storage/velamk_util.h"
#include "storage/video_fixture.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/films.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class FilmOrientation : public VideoTest {
 protected:
  int IsRotated() const { return IsVideoRotated(Media().c_str()); }
  int HasFilm() const { return HasConvertedFilm(Media().c_str()); }
  int HasMatchedFilm() const { return HasMatchedConvertedFilm(Media().c_str()); }
  int Matches(const Film& film) const {
    return IsEAFileOrientationMatched(Media().c_str(), film.name, film.oldName);
  }
};

TEST_F(FilmOrientation, AVideoIsRotatedByQuarterTurns) {
  for (const int rotation : {90, 180, 270}) {
    SCOPED_TRACE(rotation);
    MakeVideo(rotation);
    EXPECT_EQ(IsRotated(), 1);
  }
  MakeVideo(0);
  EXPECT_EQ(IsRotated(), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(FilmOrientation, APortraitVideoNeedNotBeRotated) {
  FilmRecipe portrait;
  portrait.width = 48;
  portrait.height = 64;
  MakeFilm(Media(), portrait);
  EXPECT_EQ(IsRotated(), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(FilmOrientation, AnUnreadableVideoIsNotRotated) {
  WriteFile(Media(), "no film");
  EXPECT_EQ(IsRotated(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadableVideo));
}

TEST_F(FilmOrientation, AMissingVideoIsNotRotated) {
  RemoveTree(Media());
  EXPECT_EQ(IsRotated(), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadableVideo));
}

TEST_F(FilmOrientation, EveryTurnedFilmIsAConvertedOne) {
  EXPECT_EQ(HasFilm(), 0);
  for (const Film& film : kTurnedFilms) {
    for (const char* name : {film.name, film.oldName}) {
      SCOPED_TRACE(name);
      MakeDerived(name, 2);
      EXPECT_EQ(HasFilm(), 1);
      Remove(name);
      EXPECT_EQ(HasFilm(), 0);
    }
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(FilmOrientation, AConvertedFilmMayBeEmpty) {
  MakeDerived(kLow.oldName, 0);
  EXPECT_EQ(HasFilm(), 1);
}

TEST_F(FilmOrientation, TheOtherFilmsAreNoConvertedOnes) {
  for (const Film& film : {kIphone, kFlash, kH264, kMpeg4, kConversion}) {
    MakeDerived(film.name);
    MakeDerived(film.oldName);
  }
  EXPECT_EQ(HasFilm(), 0);
  EXPECT_EQ(HasMatchedFilm(), 0);
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(FilmOrientation, AFilmMatchesARecordOfItsOrientation) {
  MakeLandscape(kFlash.name);
  MakePortrait(kHigh.name);
  EXPECT_EQ(Matches(kFlash), 1);
  EXPECT_EQ(Matches(kHigh), 0);
  SetRecord(kPortraitRecord);
  EXPECT_EQ(Matches(kFlash), 0);
  EXPECT_EQ(Matches(kHigh), 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(FilmOrientation, ASquareFilmIsNotPortrait) {
  MakeSizedFilm(kHigh.name, 64, 64);
  EXPECT_EQ(Matches(kHigh), 1);
  SetRecord(kPortraitRecord);
  EXPECT_EQ(Matches(kHigh), 0);
}

TEST_F(FilmOrientation, TheRecordIsThatOfTheVideo) {
  MakeLandscape(kFlash.name);
  Matches(kFlash);
  ASSERT_EQ(RequestCount(), 1U);
  EXPECT_EQ(Daemon().Requests().front().bytes,
            "{\"command\":\"GET_MEDIA_FROM_PLUGIN_DB\",\"path\":\"/tmp/media/film.mp4\","
            "\"type\":1}\n");
}

TEST_F(FilmOrientation, AFilmOfTheOlderNameMatchesToo) {
  SetRecord(kPortraitRecord);
  MakePortrait(kFlash.oldName);
  EXPECT_EQ(Matches(kFlash), 1);
}

TEST_F(FilmOrientation, TheCurrentNameGoesBeforeTheOlderOne) {
  MakePortrait(kFlash.name);
  MakeLandscape(kFlash.oldName);
  EXPECT_EQ(Matches(kFlash), 0);
  SetRecord(kPortraitRecord);
  EXPECT_EQ(Matches(kFlash), 1);
}

TEST_F(FilmOrientation, AFilmThatCannotBeReadIsLandscape) {
  MakeDerived(kHigh.name);
  EXPECT_EQ(Matches(kHigh), 1);
  SetRecord(kPortraitRecord);
  EXPECT_EQ(Matches(kHigh), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(FilmOrientation, AnUnknownVideoIsLandscape) {
  SetRecord(kNoRecord);
  MakeLandscape(kHigh.name);
  MakePortrait(kLow.name);
  EXPECT_EQ(Matches(kHigh), 1);
  EXPECT_EQ(Matches(kLow), 0);
  EXPECT_THAT(ErrorLines(),
              ElementsAre(kDaemonFailed, kUnknownOrientation, kDaemonFailed, kUnknownOrientation));
}

TEST_F(FilmOrientation, WithoutADaemonEveryVideoIsLandscape) {
  StopDaemon();
  MakePortrait(kLow.name);
  EXPECT_EQ(Matches(kLow), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownOrientation));
}

TEST_F(FilmOrientation, AFilmThatIsNotThereIsNotCompared) {
  MakeLandscape(kHigh.name);
  EXPECT_EQ(Matches(kMedium), -1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(FilmOrientation, WithoutAMetadataDirectoryNothingIsCompared) {
  for (const std::string& path : PathsWithoutDirectory()) {
    SCOPED_TRACE(path);
    EXPECT_EQ(IsEAFileOrientationMatched(path.c_str(), kHigh.name, kHigh.oldName), -1);
    EXPECT_EQ(HasConvertedFilm(path.c_str()), 0);
    EXPECT_EQ(HasMatchedConvertedFilm(path.c_str()), 0);
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(FilmOrientation, TheLongestPathIsCompared) {
  // The path of the film is the longest that the system takes.
  const std::string media = PathOfLength(4067, "long.mp4");
  const size_t slash = media.rfind('/');
  const std::string film =
      media.substr(0, slash) + "/@eaDir" + media.substr(slash) + "/" + kHigh.name;
  ASSERT_EQ(film.size(), 4095U);
  MakePortrait("made.mp4");
  MakeDirectories(film.substr(0, film.rfind('/')));
  CopyFile(Derived("made.mp4"), film);
  EXPECT_EQ(IsEAFileOrientationMatched(media.c_str(), kHigh.name, kHigh.oldName), 0);
  SetRecord(kPortraitRecord);
  EXPECT_EQ(IsEAFileOrientationMatched(media.c_str(), kHigh.name, kHigh.oldName), 1);
}

TEST_F(FilmOrientation, NoPathIsRefused) {
  EXPECT_EQ(IsEAFileOrientationMatched(nullptr, kHigh.name, kHigh.oldName), -1);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_util:166 Bad parameters."));
}

TEST_F(FilmOrientation, EveryTurnedFilmMayMatch) {
  MakePortrait("made.mp4");
  for (const Film& film : kTurnedFilms) {
    for (const char* name : {film.name, film.oldName}) {
      SCOPED_TRACE(name);
      CopyFile(Derived("made.mp4"), Derived(name));
      SetRecord(kPortraitRecord);
      EXPECT_EQ(HasMatchedFilm(), 1);
      SetRecord(kLandscapeRecord);
      EXPECT_EQ(HasMatchedFilm(), 0);
      Remove(name);
    }
  }
  EXPECT_EQ(HasMatchedFilm(), 0);
}

TEST_F(FilmOrientation, OneMatchingFilmIsEnough) {
  for (const Film& film : kTurnedFilms) {
    MakePortrait(film.name);
  }
  EXPECT_EQ(HasMatchedFilm(), 0);
  EXPECT_EQ(RequestCount(), 4U);
  MakeLandscape(kMobile.name);
  EXPECT_EQ(HasMatchedFilm(), 1);
  EXPECT_EQ(RequestCount(), 8U);
}

TEST_F(FilmOrientation, TheFirstMatchingFilmEndsTheSearch) {
  for (const Film& film : kTurnedFilms) {
    MakePortrait(film.name);
  }
  size_t place = 0;
  for (const Film& film : kTurnedFilms) {
    SCOPED_TRACE(film.name);
    MakeLandscape(film.name);
    const size_t before = RequestCount();
    EXPECT_EQ(HasMatchedFilm(), 1);
    // One question for each film up to the one that matches.
    EXPECT_EQ(RequestCount() - before, ++place);
    MakePortrait(film.name);
  }
}

TEST_F(FilmOrientation, AFailureOfTheDaemonCostsOneFilmOnly) {
  SetRecord(kPortraitRecord);
  SetNextRecord(kNoRecord);
  MakePortrait(kHigh.name);
  MakePortrait(kMedium.name);
  EXPECT_EQ(HasMatchedFilm(), 1);
  EXPECT_THAT(Daemon().Requests(), SizeIs(2));
  EXPECT_THAT(ErrorLines(), ElementsAre(kDaemonFailed, kUnknownOrientation));
}

}  // namespace
}  // namespace vela_test
