// The page as an option of the program.
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>

#include "status_fixture.h"
#include "support/daemon_peer.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr const char* kPage = "/tmp/page/status.html";

class PageOption : public StatusTest {
 protected:
  void SetUp() override {
    StatusTest::SetUp();
    MakePhoto("/tmp/photos/a.jpg");
    MakeDirectories("/tmp/page");
  }

  /// A page that cannot be written is reported before the scan; directories are not reported.
  static void ExpectRefused(const std::string& page, const std::string& message) {
    ProgramOptions options;
    options.timeLimit = std::chrono::seconds(20);
    const ProgramResult text = RunStatus({"--html", page, "/tmp/none", kTop}, options);
    ExpectError(text, page + ": " + message);
    EXPECT_EQ(text.out, "");
    const ProgramResult json = RunStatus({"--html", page, "--json", kTop}, options);
    EXPECT_EQ(json.exitCode, 2) << page;
    const Json::Value errors = ReadJson(json.out)["errors"];
    ASSERT_EQ(errors.size(), 1U) << page;
    ExpectMembers(errors[0], "{\"path\": \"" + page + "\", \"message\": \"" + message + "\"}");
  }
};

TEST_F(PageOption, WritesThePageBesideTheReport) {
  const ProgramResult result = RunStatus({"--html", kPage, kTop});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "");
  EXPECT_EQ(ReadStatusText(result.out).totals.numbers.photos, 1);
  EXPECT_THAT(ReadFile(kPage), HasSubstr("<bdi>a.jpg</bdi>"));
}

TEST_F(PageOption, OnlyARegularFileIsReplaced) {
  ASSERT_EQ(mkfifo(kPage, 0666), 0);
  ASSERT_EQ(symlink("/dev/null", "/tmp/page/link"), 0);
  for (const std::string page : {"/dev/null", kPage, "/tmp/page/link"}) {
    ExpectRefused(page, "is not a regular file");
  }
  ExpectRefused("/tmp/page", "Is a directory");
  ExpectRefused("/tmp/none/page.html", "No such file or directory");
  struct stat status = {};
  ASSERT_EQ(stat("/dev/null", &status), 0);
  EXPECT_TRUE(S_ISCHR(status.st_mode));
  EXPECT_EQ(ListDirectory("/tmp/page").size(), 2U);
}

TEST_F(PageOption, VideosAreNotCheckedForARefusedPage) {
  const DaemonPeer service;
  const std::string thumb = "/tmp/photos/@eaDir/film.mp4/VELAPHOTO_THUMB_M.jpg";
  WriteFile("/tmp/photos/film.mp4", "video");
  WriteFile(thumb, "thumb");
  SetFileTime(thumb, kMediaTime);
  EXPECT_EQ(RunStatus({"--html", "/dev/null", "--check-videos", kTop}).exitCode, 2);
  EXPECT_TRUE(Exists(thumb));
  EXPECT_EQ(RunStatus({"--html", kPage, "--check-videos", kTop}).exitCode, 1);
  EXPECT_FALSE(Exists(thumb));
}

TEST_F(PageOption, OtherReportsAreMadeWithoutARefusedPage) {
  const ProgramResult result = RunStatus({"--html", "/dev/null", "--json", "--queue", kTop});
  EXPECT_EQ(result.exitCode, 2);
  const Json::Value answer = ReadJson(result.out);
  EXPECT_EQ(answer["queues"].size(), 5U);
  EXPECT_FALSE(answer.isMember("directories"));
}

TEST_F(PageOption, APhotoThatCannotBeLookedUpIsAnErrorAndUnknownOnThePage) {
  constexpr size_t kTooLongForMetadata = 4093;
  const std::string photo = PathOfLength(kTooLongForMetadata, "deep.jpg");
  const std::string dir = photo.substr(0, photo.rfind('/'));
  MakePhoto(photo);
  const ProgramResult result = RunStatus({"--html", kPage, dir});
  ExpectError(result, photo + ": its thumbnails cannot be looked up");
  EXPECT_EQ(ReadStatusText(result.out).totals.numbers, (StatusNumbers{1, 0, 0, 0, 0}));
  const std::string page = ReadFile(kPage);
  EXPECT_THAT(page, HasSubstr("<strong class=\"mark\">Unknown</strong>"));
  EXPECT_THAT(page, HasSubstr("<bdi>deep.jpg</bdi>"));
  const Json::Value answer = QueryJson({dir});
  EXPECT_EQ(answer["totals"]["photos"], Json::Value(1));
  EXPECT_EQ(answer["errors"][0]["path"], Json::Value(photo));
}

TEST_F(PageOption, ADanglingLinkIsNotAPhoto) {
  ASSERT_EQ(symlink("/tmp/none.jpg", "/tmp/photos/x.jpg"), 0);
  const ProgramResult result = RunStatus({"--html", kPage, "--photos", kTop});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "");
  EXPECT_EQ(ReadStatusText(result.out).totals.numbers.photos, 1);
  EXPECT_THAT(result.out, Not(HasSubstr("x.jpg")));
  EXPECT_THAT(ReadFile(kPage), Not(HasSubstr("x.jpg")));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PageOption, PlantedThumbsAreNeverEmbedded) {
  const std::string ea = "/tmp/photos/@eaDir/a.jpg";
  WriteFile("/tmp/secret.jpg", "\xff\xd8\xff secret");
  MakeDirectories(ea);
  ASSERT_EQ(symlink("/tmp/secret.jpg", (ea + "/VELAPHOTO_THUMB_S.jpg").c_str()), 0);
  WriteFile(ea + "/VELAPHOTO_THUMB_SM.jpg", "root:x:0:0");
  RunStatus({"--html", kPage, kTop});
  EXPECT_THAT(ReadFile(kPage), Not(HasSubstr("base64")));
  WriteFile(ea + "/VELAPHOTO_THUMB_M.jpg", "\xff\xd8\xff open");
  RunStatus({"--html", kPage, kTop});
  EXPECT_THAT(ReadFile(kPage), HasSubstr("src=\"data:image/jpeg;base64,/9j/IG9wZW4=\""));
}

TEST_F(PageOption, PhotosAreSortedByName) {
  for (const char* name : {"c", "B", "b", "0"}) {
    MakePhoto(In(name + std::string(".jpg")));
  }
  RunStatus({"--html", kPage, kTop});
  const std::string page = ReadFile(kPage);
  size_t last = 0;
  for (const char* name : {"0", "B", "a", "b", "c"}) {
    const size_t at = page.find("<bdi>" + std::string(name) + ".jpg</bdi>");
    ASSERT_NE(at, std::string::npos) << name;
    EXPECT_GT(at, last) << name;
    last = at;
  }
}

}  // namespace
}  // namespace vela_test
