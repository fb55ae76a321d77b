// Videos that need work, and what their check removes.
#include <sys/stat.h>

#include <optional>

#include "status_fixture.h"
#include "storage/velamk_thumb_status.h"
#include "support/daemon_peer.h"
#include "support/films.h"
#include "support/images.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr const char* kQuestion = "GET_MEDIA_FROM_PLUGIN_DB";
constexpr const char* kLandscape = R"({"success":true,"media":{"width":640,"height":480}})";
constexpr const char* kPortrait = R"({"success":true,"media":{"width":480,"height":640}})";

/// A directory of videos and the index service, which reports every video as landscape.
class VideoCheck : public StatusTest {
 protected:
  void SetUp() override {
    StatusTest::SetUp();
    daemon_.emplace();
    SetRecord(kLandscape);
  }

  DaemonPeer& Daemon() { return *daemon_; }
  void SetRecord(const char* record) { daemon_->Answer(kQuestion, DaemonReply::Line(record)); }

  static std::string EaDir(const std::string& file) { return In("@eaDir/") + file; }

  static void MakeVideo(const std::string& name, int rotation = 0,
                        const std::string& codec = "libx264") {
    FilmRecipe recipe;
    recipe.rotation = rotation;
    recipe.videoCodec = codec;
    recipe.seconds = 0.2;
    MakeFilm(In(name), recipe);
    SetFileTime(In(name), kMediaTime);
  }

  /// Makes landscape thumbnails of all sizes.
  static void MakeVideoThumbs(const std::string& video) {
    MakeDirectories(EaDir(video));
    for (const char* name : kThumbNames) {
      MakeJpeg(Derived(video, name));
      SetFileTime(Derived(video, name), kMediaTime + 1);
    }
  }

  static StatusText Check() {
    const ProgramResult result = RunStatus({"--check-videos", kTop});
    EXPECT_EQ(result.err, "");
    return ReadStatusText(result.out);
  }

 private:
  std::optional<DaemonPeer> daemon_;  // not before the sandbox is reset
};

TEST_F(VideoCheck, ACompleteVideoIsKept) {
  MakeVideo("a.mp4");
  MakeVideoThumbs("a.mp4");
  const std::vector<std::string> before = ListTree(kTop);
  const ProgramResult result = RunStatus({"--check-videos", kTop});
  EXPECT_EQ(result.exitCode, 0);
  const StatusText answer = ReadStatusText(result.out);
  EXPECT_EQ(answer.directories.at(0).videos, "0");
  EXPECT_EQ(answer.totals.videos, "0");
  EXPECT_EQ(ListTree(kTop), before);
  EXPECT_THAT(Daemon().Commands(), Not(IsEmpty()));
}

TEST_F(VideoCheck, VideosThatLackThumbsNeedWork) {
  MakeVideo("a.mp4");
  MakeVideo("b.mp4");
  MakeVideoThumbs("b.mp4");
  RemoveTree(Derived("b.mp4", kThumbNames[0]));
  WriteFile(In("c.txt"), "no video");
  const ProgramResult result = RunStatus({"--check-videos", kTop});
  EXPECT_EQ(result.exitCode, 1);
  const StatusLine totals = ReadStatusText(result.out).totals;
  EXPECT_EQ(totals.videos, "2");
  EXPECT_EQ(totals.numbers, (StatusNumbers{0, 0, 0, 0, 0}));
}

TEST_F(VideoCheck, ThumbsOfTheWrongOrientationAreRemovedButNothingElse) {
  SetRecord(kPortrait);
  MakeVideo("a.mp4");
  MakeVideoThumbs("a.mp4");
  WriteFile(Derived("a.mp4", "VELAPHOTO_FILM_H.mp4"), "film");
  WriteFile(Derived("a.mp4", "VELAPHOTO_THUMB_S.fail"), "");
  WriteFile(In("photo.jpg"), "photo");
  WriteFile(Derived("photo.jpg", kThumbNames[0]), "thumb");
  EXPECT_EQ(Check().directories.at(0).videos, "1");
  EXPECT_THAT(ListDirectory(EaDir("a.mp4")),
              ElementsAre("VELAPHOTO_FILM_H.mp4", "VELAPHOTO_THUMB_S.fail"));
  EXPECT_THAT(ListDirectory(EaDir("photo.jpg")), ElementsAre(kThumbNames[0]));
  EXPECT_TRUE(Exists(In("a.mp4")));
}

TEST_F(VideoCheck, OutdatedThumbsAreRemoved) {
  MakeVideo("a.mp4");
  MakeVideoThumbs("a.mp4");
  SetFileTime(Derived("a.mp4", kThumbNames[1]), kMediaTime - 1);
  EXPECT_EQ(Check().totals.videos, "1");
  EXPECT_FALSE(Exists(Derived("a.mp4", kThumbNames[1])));
  EXPECT_EQ(ListDirectory(EaDir("a.mp4")).size(), 5U);
}

TEST_F(VideoCheck, ConvertedVideosOfTheWrongOrientationAreRemoved) {
  WriteFile("/etc/velainfo.conf", "video_thumb_size_map=\"0\"\n");
  SetRecord(kPortrait);
  MakeVideo("a.mp4", 90, "mpeg4");
  MakeDirectories(EaDir("a.mp4"));
  FilmRecipe flash;
  flash.format = "flv";
  flash.seconds = 0.2;
  const std::string film = Derived("a.mp4", "VELAPHOTO_FILM.flv");
  MakeFilm(film, flash);
  EXPECT_EQ(Check().totals.videos, "1");
  EXPECT_FALSE(Exists(film));
}

TEST_F(VideoCheck, WithoutTheOptionNothingIsRemovedAndTheServiceIsNotQueried) {
  SetRecord(kPortrait);
  MakeVideo("a.mp4");
  MakeVideoThumbs("a.mp4");
  SetFileTime(Derived("a.mp4", kThumbNames[1]), kMediaTime - 1);
  WriteFile(kVideoQueue, In("a.mp4") + "\n");
  const std::vector<std::string> before = ListTree(kTop);
  RunStatus({"--recursive", "--photos", "--queue", "--progress", "--resume-time", kTop});
  RunStatus({"--recursive", "--photos", "--json", "--queue", "--progress", kTop});
  EXPECT_EQ(Daemon().Connections(), 0U);
  RunStatus({"--watch"});
  EXPECT_THAT(Daemon().Commands(), Each("IS_DISABLE_CONVERT_PHOTO"));
  EXPECT_EQ(ListTree(kTop), before);
}

TEST_F(VideoCheck, QueuedVideosAreNotCounted) {
  MakeVideo("a.mp4");
  WriteFile(kVideoQueue, In("a.mp4") + "\n");
  const ProgramResult result = RunStatus({"--check-videos", kTop});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(ReadStatusText(result.out).totals.videos, "0");
}

TEST_F(VideoCheck, CountsOfATreeAgreeWithTheLibrary) {
  MakeDirectories(In("below"));
  MakeVideo("a.mp4");
  MakeVideo("below/b.mp4");
  MakeVideo("below/c.mp4");
  const StatusText answer = QueryText({"--check-videos", "--recursive", kTop});
  ASSERT_THAT(answer.Names(), ElementsAre(kTop, In("below")));
  EXPECT_EQ(answer.directories[0].videos, "1");
  EXPECT_EQ(answer.directories[1].videos, "2");
  EXPECT_EQ(answer.totals.videos, std::to_string(CountVideoWork(kTop)));
}

TEST_F(VideoCheck, JsonHasTheCounts) {
  MakeVideo("a.mp4");
  MakeDirectories("/tmp/empty");
  const Json::Value answer = QueryJson({"--check-videos", kTop, "/tmp/empty"});
  EXPECT_EQ(answer["directories"][0]["videos_needing_work"], Json::Value(1));
  EXPECT_EQ(answer["directories"][1]["videos_needing_work"], Json::Value(0));
  EXPECT_EQ(answer["totals"]["videos_needing_work"], Json::Value(1));
}

TEST_F(VideoCheck, JsonHasTheCountsEvenWithoutAnyVideo) {
  const Json::Value nothing = QueryJson({"--check-videos", "/tmp/none"})["totals"];
  EXPECT_EQ(nothing["videos_needing_work"], Json::Value(0));
  EXPECT_EQ(nothing["queued"]["videos_needing_work"], Json::Value(0));
  MakeVideo("a.mp4");
  ASSERT_EQ(chmod(kTop, 0), 0);
  const ProgramResult closed = RunStatusAsOrdinaryUser({"--check-videos", "--json", kTop});
  EXPECT_EQ(closed.exitCode, 2);
  const Json::Value answer = ReadJson(closed.out);
  EXPECT_EQ(answer["directories"][0]["videos_needing_work"], Json::Value(0));
  EXPECT_EQ(answer["totals"]["videos_needing_work"], Json::Value(0));
}

TEST_F(VideoCheck, CountsTheVideosOfQueuedDirectoriesSeparately) {
  MakeDirectories(In("below"));
  MakeVideo("a.mp4");
  MakeVideo("below/b.mp4");
  WriteFile(kPhotoQueue, In("below") + "\n");
  const Json::Value totals = QueryJson({"--check-videos", "--recursive", kTop})["totals"];
  EXPECT_EQ(totals["videos_needing_work"], Json::Value(2));
  EXPECT_EQ(totals["queued"]["videos_needing_work"], Json::Value(1));
}

TEST_F(VideoCheck, VideosOfTheQueueAreChecked) {
  MakeDirectories(In("below"));
  MakeVideo("a.mp4");
  MakeVideo("below/b.mp4");
  MakeVideo("complete.mp4");
  MakeVideoThumbs("complete.mp4");
  WriteFile(kVideoQueue, In("a.mp4") + "\n" + In("complete.mp4") + "\nR:" + In("below") + "\n");
  WriteFile(kVideosInProgress, In("complete.mp4") + "\n");
  WriteFile(kPhotoQueue, "/tmp/photos\n");
  const ProgramResult result = RunStatus({"--queue", "--check-videos"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.out, AllOf(HasSubstr("    3 entries, videos that need work: 2\n"),
                                HasSubstr("    1 entry, videos that need work: 0\n"),
                                HasSubstr("    1 entry\n")));
  const Json::Value queues = QueryJson({"--queue", "--check-videos"})["queues"];
  const Json::Value expected[] = {Json::Value(), Json::Value(), Json::Value(0), Json::Value(2)};
  for (Json::ArrayIndex i = 0; i < 4; ++i) {
    EXPECT_EQ(queues[i]["videos_needing_work"], expected[i]) << i;
  }
}

TEST_F(VideoCheck, OnlyTheOptionLoadsTheVideoLibrary) {
  MakeVideo("a.mp4");
  MakeVideoThumbs("a.mp4");
  ProgramOptions options;
  options.addedEnvironment = {"LD_DEBUG=files"};
  std::vector<std::string> arguments = {"-rp", "--queue", "--progress", "--resume-time", kTop};
  EXPECT_THAT(RunStatus(arguments, options).err, Not(HasSubstr("libavformat")));
  arguments.emplace_back("--check-videos");
  EXPECT_THAT(RunStatus(arguments, options).err, HasSubstr("libavformat"));
}

}  // namespace
}  // namespace vela_test
