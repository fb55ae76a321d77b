// Index versions, switches and posts.
#include <ctime>

#include "index_daemon.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr const char* kSettings = "/etc/velainfo.conf";

class IndexVersionTest : public IndexDaemonTest {};
class SwitchTest : public IndexDaemonTest {};
class PostTest : public IndexDaemonTest {};

TEST_F(IndexVersionTest, IsThatOfTheSettings) {
  const std::pair<const char*, int> cases[] = {
      {"", 0}, {"index_version=\"7\"\n", 7}, {"index_version=\"2147483647\"\n", 2147483647}};
  for (const auto& [settings, version] : cases) {
    WriteFile(kSettings, settings);
    IndexDaemon daemon;
    EXPECT_EQ(GetIndexVersion("/photos/a.jpg"), version) << settings;
    daemon.End(SIGTERM);
  }
  RemoveTree(kSettings);
  const IndexDaemon daemon;
  EXPECT_EQ(GetIndexVersion("/photos/a.jpg"), 0);
}

TEST_F(IndexVersionTest, IsZeroWhenTheSettingIsNotAWholeNumber) {
  for (const char* value : {"2147483648", "-1", "1.5", "3x", "x", "", " "}) {
    WriteFile(kSettings, std::string("index_version=\"") + value + "\"\n");
    IndexDaemon daemon;
    EXPECT_EQ(GetIndexVersion("/photos/a.jpg"), 0) << value;
    EXPECT_NE(daemon.End(SIGTERM).err.find("index_version is not a number"), std::string::npos);
  }
}

TEST_F(IndexVersionTest, MistakesInTheSettingsAreLoggedAtTheStart) {
  WriteFile(kSettings, "tool_timeout=\"60\"\n\x1b[2J=1\nindex_versoin=\"3\"\n");
  IndexDaemon daemon;
  const std::string log = daemon.End(SIGTERM).err;
  EXPECT_THAT(
      log, HasSubstr("level=warning event=settings file=/etc/velainfo.conf line=2 "
                     "problem=\"there is no setting \\\"\\\\x1b[2J\\\"; see velainfo.conf(5)\"\n"));
  EXPECT_THAT(log, HasSubstr("level=warning event=settings file=/etc/velainfo.conf line=3 "
                             "problem=\"there is no setting \\\"index_versoin\\\"; did you mean "
                             "index_version?\"\n"));
  EXPECT_THAT(log, Not(HasSubstr("line=1 ")));
}

TEST_F(IndexVersionTest, AnErrorInTheSettingsIsLoggedAsOne) {
  WriteFile(kSettings, "convert_memory_limit=\"512K\"\n");
  IndexDaemon daemon;
  EXPECT_THAT(daemon.End(SIGTERM).err,
              HasSubstr("level=error event=settings file=/etc/velainfo.conf line=1 "
                        "problem=\"convert_memory_limit is less than 1M: "));
}

TEST_F(IndexVersionTest, OfTheNearestDirectoryApplies) {
  WriteFile(kSettings, "index_version=\"7\"\n");
  const IndexDaemon daemon;
  ASSERT_TRUE(SetVersion("/photos", 1));
  ASSERT_TRUE(SetVersion("/photos/2024/raw", 3));
  const std::pair<const char*, int> versions[] = {
      {"/photos", 1},
      {"/photos/a.jpg", 1},
      {"/photos/2024/a.jpg", 1},
      {"/photos/2024/raw/b/c/a.jpg", 3},
      {"/photos/2024/rawer/a.jpg", 1},
      {"/photos2/a.jpg", 7},
      {"/", 7},
  };
  for (const auto& [path, version] : versions) {
    EXPECT_EQ(GetIndexVersion(path), version) << path;
  }
}

TEST_F(IndexVersionTest, OfADirectoryMayBeZero) {
  WriteFile(kSettings, "index_version=\"7\"\n");
  const IndexDaemon daemon;
  ASSERT_TRUE(SetVersion("/photos", 0));
  EXPECT_EQ(GetIndexVersion("/photos/a.jpg"), 0);
}

TEST_F(IndexVersionTest, OfTheRootAppliesToAll) {
  const IndexDaemon daemon;
  ASSERT_TRUE(SetVersion("/", 4));
  EXPECT_EQ(GetIndexVersion("/photos/a.jpg"), 4);
  EXPECT_EQ(GetIndexVersion("/"), 4);
}

TEST_F(IndexVersionTest, PathsMayHaveSeveralSpellings) {
  const IndexDaemon daemon;
  ASSERT_TRUE(SetVersion("//photos/./new/", 4));
  EXPECT_EQ(GetIndexVersion("/photos/new/a.jpg"), 4);
  EXPECT_EQ(GetIndexVersion("/photos//new//a.jpg"), 4);
  EXPECT_EQ(GetIndexVersion("/photos/new/../old/a.jpg"), 0);
  ASSERT_TRUE(SetVersion("/photos/new", Json::Value()));
  EXPECT_EQ(GetIndexVersion("/photos/new/a.jpg"), 0);
}

TEST_F(IndexVersionTest, OfTheParentAppliesAfterRemoval) {
  const IndexDaemon daemon;
  ASSERT_TRUE(SetVersion("/photos", 1));
  ASSERT_TRUE(SetVersion("/photos/new", 2));
  ASSERT_TRUE(SetVersion("/photos/new", Json::Value()));
  EXPECT_EQ(GetIndexVersion("/photos/new/a.jpg"), 1);
  EXPECT_TRUE(SetVersion("/photos/none", Json::Value())) << "there was none to remove";
}

TEST_F(IndexVersionTest, OfADirectorySurvivesARestart) {
  {
    IndexDaemon daemon;
    ASSERT_TRUE(SetVersion("/photos \xff\n", 5));
    daemon.End(SIGKILL);
  }
  const IndexDaemon daemon;
  EXPECT_EQ(GetIndexVersion("/photos \xff\n/a.jpg"), 5);
}

TEST_F(IndexVersionTest, IsSetFromTheCommandLine) {
  const IndexDaemon daemon;
  EXPECT_EQ(RunDaemon({"--set-index-version", "/photos/a=b=12"}).exitCode, 0);
  EXPECT_EQ(GetIndexVersion("/photos/a=b/x.jpg"), 12);
  EXPECT_EQ(RunDaemon({"--unset-index-version", "/photos/a=b"}).exitCode, 0);
  EXPECT_EQ(GetIndexVersion("/photos/a=b/x.jpg"), 0);
}

TEST_F(IndexVersionTest, CommandLineReportsAMissingDaemon) {
  const ProgramResult result = RunDaemon({"--set-index-version", "/photos=1"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "velaindexplugind: no daemon answers at /tmp/velaindexplugind_sock\n");
}

TEST_F(IndexVersionTest, CommandLineReportsTheDaemonsRefusal) {
  const IndexDaemon daemon;
  const ProgramResult result = RunDaemon({"--unset-index-version", "/" + std::string(5000, 'x')});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "velaindexplugind: path is longer than 4095 bytes\n");
}

TEST_F(IndexVersionTest, CommandLineRejectsInvalidArguments) {
  const std::vector<std::vector<std::string>> wrong = {
      {"--set-index-version", "/photos"},
      {"--set-index-version", "/photos="},
      {"--set-index-version", "/photos=-1"},
      {"--set-index-version", "/photos=2147483648"},
      {"--set-index-version", "photos=1"},
      {"--set-index-version", "=1"},
      {"--unset-index-version", "photos"},
      {"--unset-index-version", ""},
      {"--set-index-version", "/a=1", "--unset-index-version", "/a"},
      {"--workers", "0"},
      {"--client-timeout", "0"},
      {"--database", ""},
      {"--no-such-option"},
      {"word"}};
  for (const auto& arguments : wrong) {
    const ProgramResult result = RunDaemon(arguments);
    EXPECT_EQ(result.exitCode, 2) << arguments.back();
    EXPECT_NE(result.err, "") << arguments.back();
  }
}

TEST_F(SwitchTest, IsOffUnlessTheSettingIsYes) {
  for (const char* value : {"no", "", "YES", "yes ", "1", "true", "yess"}) {
    WriteFile(kSettings, std::string("disable_convert_photo=\"") + value +
                             "\"\ndisable_convert_video=\"" + value + "\"\n");
    IndexDaemon daemon;
    EXPECT_FALSE(IsDisableConvertPhoto()) << value;
    EXPECT_FALSE(IsDisableConvertVideo()) << value;
    EXPECT_EQ(daemon.End(SIGTERM).exitCode, 0);
  }
}

TEST_F(SwitchTest, EachKindHasItsOwnSetting) {
  for (const bool isPhoto : {true, false}) {
    WriteFile(kSettings,
              isPhoto ? "disable_convert_photo=\"yes\"\n" : "disable_convert_video=\"yes\"\n");
    IndexDaemon daemon;
    EXPECT_EQ(IsDisableConvertPhoto(), isPhoto);
    EXPECT_EQ(IsDisableConvertVideo(), !isPhoto);
    EXPECT_EQ(daemon.End(SIGTERM).exitCode, 0);
  }
}

TEST_F(SwitchTest, SettingsAreReloadedOnHangUpOnly) {
  WriteFile(kSettings, "");
  IndexDaemon daemon;
  WriteFile(kSettings,
            "disable_convert_photo=\"yes\"\ndisable_convert_video=\"yes\"\nindex_version=\"9\"\n");
  EXPECT_FALSE(IsDisableConvertPhoto());
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  daemon.Process().Kill(SIGHUP);
  ASSERT_TRUE(daemon.WaitForLog("index_version=9"));
  EXPECT_TRUE(IsDisableConvertPhoto());
  EXPECT_TRUE(IsDisableConvertVideo());
  EXPECT_EQ(GetIndexVersion("/a"), 9);
}

TEST_F(PostTest, IsStoredWithItsKindAndTime) {
  const IndexDaemon daemon;
  const std::time_t before = std::time(nullptr);
  PostPhotoConvert("/photos/a \xff.jpg");
  PostVideoConvert("/photos/b.mp4");
  const std::time_t after = std::time(nullptr);
  EXPECT_EQ(Query("SELECT hex(path), kind FROM posted ORDER BY kind"),
            (Rows{"2F70686F746F732F6120FF2E6A7067|1", "2F70686F746F732F622E6D7034|2"}));
  EXPECT_EQ(Query("SELECT count(*) FROM posted WHERE posted_at BETWEEN " + std::to_string(before) +
                  " AND " + std::to_string(after)),
            Rows{"2"});
}

TEST_F(PostTest, LatestReplacesTheEarlierOne) {
  const IndexDaemon daemon;
  PostPhotoConvert("/photos/a.jpg");
  Query("UPDATE posted SET posted_at = 5");
  PostPhotoConvert("/photos/a.jpg");
  EXPECT_EQ(Query("SELECT count(*), min(posted_at) > 5 FROM posted"), Rows{"1|1"});
}

}  // namespace
}  // namespace vela_test
