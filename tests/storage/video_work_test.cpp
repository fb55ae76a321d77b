// Whether one video needs work.
#include <gmock/gmock.h>

#include <optional>
#include <string>

#include "storage/media_fixture.h"
#include "storage/velamk_thumb_status.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/films.h"
#include "support/images.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kLandscape = R"({"success":true,"media":{"width":640,"height":480}})";
constexpr const char* kPortrait = R"({"success":true,"media":{"width":480,"height":640}})";

/// A browser plays it.
FilmRecipe PlayableFilm() {
  return FilmRecipe();
}

/// No browser plays it.
FilmRecipe ForeignFilm() {
  FilmRecipe recipe;
  recipe.videoCodec = "mpeg4";
  recipe.format = "avi";
  return recipe;
}

/// A video, the file of which is text unless a test makes it a film.
class VideoWork : public MediaTest {
 protected:
  VideoWork() : MediaTest("film.mp4") {}

  void SetUp() override {
    MediaTest::SetUp();
    daemon_.emplace();
    SetRecord(kLandscape);
  }

  void SetRecord(const std::string& reply) {
    daemon_->Answer("GET_MEDIA_FROM_PLUGIN_DB", DaemonReply::Line(reply));
  }

  void MakeMedia(const FilmRecipe& recipe) const {
    MakeFilm(Media(), recipe);
    SetFileTime(Media(), kMediaTime);
  }

  void MakeThumb(const std::string& name) const {
    MakeJpeg(Derived(name));
    SetFileTime(Derived(name), kMediaTime);
  }

  void MakeAllThumbs() const {
    for (const char* name : kThumbNames) {
      MakeThumb(name);
    }
  }

  int IsNeeded() const { return IsVideoWorkNeeded(Media().c_str()); }

 private:
  std::optional<DaemonPeer> daemon_;  // not before the sandbox is reset
};

TEST_F(VideoWork, IsNotNeededForWhatIsNoVideo) {
  EXPECT_EQ(IsVideoWorkNeeded(nullptr), 0);
  EXPECT_EQ(IsVideoWorkNeeded(""), 0);
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/media/none.mp4"), 0);
  MakeDirectories("/tmp/media/directory.mp4");
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/media/directory.mp4"), 0);
  for (const char* name : {"/tmp/media/a.jpg", "/tmp/media/a.txt", "/tmp/media/mp4"}) {
    WriteFile(name, "no video");
    EXPECT_EQ(IsVideoWorkNeeded(name), 0) << name;
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoWork, IsNeededForAVideoWithoutThumbs) {
  EXPECT_EQ(IsNeeded(), 1);
  MakeMedia(PlayableFilm());
  EXPECT_EQ(IsNeeded(), 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoWork, IsNeededForOneMissingThumb) {
  MakeMedia(PlayableFilm());
  MakeAllThumbs();
  EXPECT_EQ(IsNeeded(), 0);
  RemoveTree(Derived(kThumbNames[5]));
  EXPECT_EQ(IsNeeded(), 1);
  MakeThumb(kOldThumbNames[5]);
  EXPECT_EQ(IsNeeded(), 0);
}

TEST_F(VideoWork, OnlyThumbsOfTheVideoSizesAreNeeded) {
  MakeMedia(PlayableFilm());
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"63\"\nvideo_thumb_size_map=\"2\"\n");
  EXPECT_EQ(IsNeeded(), 1);
  MakeThumb(kThumbNames[1]);
  EXPECT_EQ(IsNeeded(), 0);
}

TEST_F(VideoWork, ThumbsThatStandWronglyAreRemoved) {
  MakeMedia(PlayableFilm());
  MakeAllThumbs();
  MakeThumb(kOldThumbNames[1]);
  SetRecord(kPortrait);
  EXPECT_EQ(IsNeeded(), 1);
  EXPECT_THAT(ListDirectory(EaDir()), IsEmpty());
}

TEST_F(VideoWork, OutdatedThumbsAreRemoved) {
  MakeMedia(PlayableFilm());
  MakeAllThumbs();
  SetFileTime(Derived(kThumbNames[0]), kMediaTime - 1);
  EXPECT_EQ(IsNeeded(), 1);
  EXPECT_FALSE(Exists(Derived(kThumbNames[0])));
  EXPECT_TRUE(Exists(Derived(kThumbNames[1])));
}

TEST_F(VideoWork, WithoutWantedSizesThumbsAreNeitherNeededNorChecked) {
  MakeMedia(PlayableFilm());
  WriteFile("/etc/velainfo.conf", "video_thumb_size_map=\"0\"\n");
  WriteFile(Derived(kThumbNames[0]), "");
  EXPECT_EQ(IsNeeded(), 0);
  EXPECT_TRUE(Exists(Derived(kThumbNames[0])));
  MakeMedia(ForeignFilm());
  EXPECT_EQ(IsNeeded(), 1);
}

TEST_F(VideoWork, IsNeededForAForeignFilmWithoutConvertedOne) {
  MakeMedia(ForeignFilm());
  MakeAllThumbs();
  EXPECT_EQ(IsNeeded(), 1);
  MakeDerived("VELAPHOTO_FILM_H.mp4", 1);
  EXPECT_EQ(IsNeeded(), 1);
  MakeDerived("VELAPHOTO_FILM_H.mp4", 2);
  EXPECT_EQ(IsNeeded(), 0);
}

TEST_F(VideoWork, MobileFilmsCountWhenTheSettingsAskForThem) {
  MakeMedia(ForeignFilm());
  MakeAllThumbs();
  MakeDerived("VELAPHOTO_FILM.flv");
  EXPECT_EQ(IsNeeded(), 0);
  WriteFile("/etc/velainfo.conf", "enable_mobile_video=\"yes\"\n");
  EXPECT_EQ(IsNeeded(), 1);
  MakeDerived("VELAPHOTO_FILM_MPEG4.mp4");
  EXPECT_EQ(IsNeeded(), 0);
}

TEST_F(VideoWork, AConvertedFilmDoesNotReplaceAThumb) {
  MakeMedia(ForeignFilm());
  MakeDerived("VELAPHOTO_FILM_H.mp4");
  EXPECT_EQ(IsNeeded(), 1);
}

TEST_F(VideoWork, AFilmThatPlaysNeedsNoConvertedOne) {
  MakeMedia(PlayableFilm());
  MakeAllThumbs();
  EXPECT_EQ(IsNeeded(), 0);
}

TEST_F(VideoWork, AnUnreadableFilmNeedsNoConvertedOne) {
  MakeAllThumbs();
  EXPECT_EQ(IsNeeded(), 0);
}

TEST_F(VideoWork, AFailedLookForConvertedFilmsCountsAsConverted) {
  WriteFile("/etc/velainfo.conf", "video_thumb_size_map=\"0\"\n");
  const std::string outside = "/tmp/media/b.avi";
  const std::string inside = Derived("b.avi");
  MakeFilm(outside, ForeignFilm());
  CopyFile(outside, inside);
  EXPECT_EQ(IsVideoWorkNeeded(outside.c_str()), 1);
  EXPECT_EQ(IsVideoWorkNeeded(inside.c_str()), 0);
}

TEST_F(VideoWork, AVideoWithoutMetadataDirectoryLacksItsThumbs) {
  const std::string inside = Derived("b.mp4");
  WriteFile(inside, "video");
  EXPECT_EQ(IsVideoWorkNeeded(inside.c_str()), 1);
}

TEST_F(VideoWork, PathsAreTakenUpToTheLengthThatLeavesRoomForDerivedNames) {
  const std::string longest = PathOfLength(4066, "a.mp4");
  WriteFile(longest, "video");
  EXPECT_EQ(IsVideoWorkNeeded(longest.c_str()), 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
  const std::string tooLong = PathOfLength(4067, "a.mp4");
  WriteFile(tooLong, "video");
  EXPECT_EQ(IsVideoWorkNeeded(tooLong.c_str()), 0);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_thumb_status:295 [Error] path is too long and can't create "
                          "thumbnail: " +
                          tooLong));
}

TEST_F(VideoWork, OnlyVideosAreLoggedAsTooLong) {
  const std::string photo = PathOfLength(4067, "a.jpg");
  WriteFile(photo, "photo");
  EXPECT_EQ(IsVideoWorkNeeded(photo.c_str()), 0);
  EXPECT_EQ(IsVideoWorkNeeded(PathOfLength(4067, "none.mp4").c_str()), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
