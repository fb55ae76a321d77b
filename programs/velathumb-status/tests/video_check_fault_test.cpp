// When videos cannot be checked, nothing is removed.
#include <cerrno>

#include "status_fixture.h"
#include "support/daemon_peer.h"
#include "support/films.h"
#include "support/missing_library.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr const char* kVideo = "/tmp/photos/a.mp4";
constexpr const char* kThumb = "/tmp/photos/@eaDir/a.mp4/VELAPHOTO_THUMB_M.jpg";
constexpr const char* kNoService =
    "--check-videos: the index service does not answer; no video was checked";
constexpr const char* kNoLibrary =
    "--check-videos: the library that reads videos is not installed; no video was checked";

/// A video with an outdated thumbnail, which the check removes.
class VideoCheckFault : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    WriteFile(kVideo, "video");
    SetFileTime(kVideo, kMediaTime);
    WriteFile(kThumb, "thumb");
    SetFileTime(kThumb, kMediaTime - 1);
    WriteFile(kVideoQueue, std::string(kVideo) + "\n");
  }

  /// Requests the check in every way; expects only this message each time, and that nothing is
  /// removed.
  static void ExpectNothingChecked(const std::string& message) {
    const std::vector<std::string> before = ListTree("/tmp");
    const ProgramResult directory = RunStatus({"--check-videos", kTop});
    ExpectError(directory, message);
    EXPECT_EQ(ReadStatusText(directory.out).totals.videos, "-");
    const ProgramResult queue = RunStatus({"--check-videos", "--queue"});
    ExpectError(queue, message);
    EXPECT_THAT(queue.out, HasSubstr(std::string("    ") + kVideo + "\n    1 entry\n"));
    EXPECT_THAT(queue.out, Not(HasSubstr("videos that need work")));
    ExpectNothingCheckedInJson();
    EXPECT_EQ(ListTree("/tmp"), before);
  }

  /// Checks that the thumbnail is removed once the check is possible.
  static void ExpectChecked() {
    const ProgramResult result = RunStatus({"--check-videos", "--queue", "-r", kTop});
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_EQ(result.err, "");
    EXPECT_FALSE(Exists(kThumb));
  }

 private:
  static void ExpectNothingCheckedInJson() {
    const ProgramResult result =
        RunStatus({"--json", "--check-videos", "--recursive", "--queue", kTop});
    EXPECT_EQ(result.exitCode, 2);
    const Json::Value answer = ReadJson(result.out);
    EXPECT_EQ(answer["directories"][0]["videos_needing_work"], Json::Value());
    EXPECT_EQ(answer["totals"]["videos_needing_work"], Json::Value());
    ASSERT_EQ(answer["queues"].size(), 5U);
    EXPECT_EQ(answer["queues"][3]["videos_needing_work"], Json::Value());
    EXPECT_EQ(answer["queues"][3]["entries"].size(), 1U);
    EXPECT_EQ(answer["errors"].size(), 1U);
  }
};

TEST_F(VideoCheckFault, WithoutTheIndexServiceNothingIsRemoved) {
  ExpectNothingChecked(kNoService);
  const DaemonPeer service;
  ExpectChecked();
}

TEST_F(VideoCheckFault, AFailingServiceIsTreatedAsAbsent) {
  DaemonPeer service;
  service.Answer("GET_INDEX_VERSION", DaemonReply::CloseAfterRequest());
  ExpectNothingChecked(kNoService);
  EXPECT_THAT(service.Commands(),
              ElementsAre("GET_INDEX_VERSION", "GET_INDEX_VERSION", "GET_INDEX_VERSION"));
  service.SetIndexVersion(0);
  ExpectChecked();
}

TEST_F(VideoCheckFault, WithoutTheVideoLibraryNothingIsRemoved) {
  DaemonPeer service;
  {
    const MissingLibrary missing("libavformat");
    ExpectNothingChecked(kNoLibrary);
    EXPECT_THAT(service.Commands(), IsEmpty());
  }
  ExpectChecked();
}

TEST_F(VideoCheckFault, OtherReportsNeedNoVideoLibrary) {
  const MissingLibrary missing("libavformat");
  const ProgramResult result = RunStatus({"--queue", "--progress", "--resume-time", "-rp", kTop});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "");
}

/// The results that a new process gets for the videos, see video_probe.
std::string Probe(const std::vector<std::string>& files) {
  const ProgramResult result = RunProgram(BuiltPath(VIDEO_PROBE_FILE), files);
  EXPECT_EQ(result.exitCode, 0) << result.err;
  return result.out;
}

TEST_F(VideoCheckFault, WithoutTheVideoLibraryEveryQueryReportsItsAbsence) {
  const std::string film = MakeFilm("/tmp/photos/b.mp4");
  const std::string noLibrary = "-1:" + std::to_string(ELIBACC) + ' ';
  const std::string noFile = "-1:" + std::to_string(ENOENT) + ' ';
  const std::string noVideo = "-1:" + std::to_string(EINVAL) + ' ';
  {
    const MissingLibrary missing("libavformat");
    const std::string line = noLibrary + noLibrary + noLibrary + '\n';
    EXPECT_EQ(Probe({film, kVideo, film}), line + line + line);
    EXPECT_EQ(Probe({"/tmp/none.mp4"}), noFile + noFile + noFile + '\n');
  }
  EXPECT_EQ(Probe({film, kVideo}), "0:0 0:0 0:0 \n" + noVideo + noVideo + noVideo + '\n');
}

}  // namespace
}  // namespace vela_test
