// The index database: shared with other programs, among them velathumb, and never damaged.
#include <sys/stat.h>

#include <cstdio>
#include <thread>

#include "index_daemon.h"
#include "support/build_paths.h"
#include "support/images.h"
#include "support/profile_file.h"
#include "support/quiet_thread.h"
#include "support/stub_tool.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using namespace ::testing;

class SharedIndexTest : public IndexDaemonTest {
 protected:
  static VELA_MEDIA_INFO Media(const std::string& path) {
    VELA_MEDIA_INFO media = {};
    std::snprintf(media.path, sizeof media.path, "%s", path.c_str());
    media.width = 4;
    media.height = 3;
    return media;
  }

  /// Registers a thumbnail as velathumb does. Returns 0 on success.
  static int RegisterConversion(const std::string& path) {
    return VELAIDX_IndexConvertAdd(Media(path), Media(path + ".thumb"), Json::Value());
  }
};

TEST_F(SharedIndexTest, IsCreatedWithItsDirectory) {
  ProgramOptions options;
  options.umask = 077;
  const IndexDaemon daemon({}, options);
  EXPECT_EQ(Query("PRAGMA journal_mode"), Rows{"wal"});
  EXPECT_EQ(Query("SELECT version FROM velaindexplugind_schema"), Rows{"1"});
  EXPECT_EQ(Query("PRAGMA user_version"), Rows{"0"}) << "reserved for other programs";
}

TEST_F(SharedIndexTest, IsForItsOwnerAndGroupWhateverTheUmask) {
  for (const mode_t mask : {0U, 077U}) {
    RemoveTree("/var/lib/velaindex");
    ProgramOptions options;
    options.umask = mask;
    IndexDaemon daemon({}, options);
    PostPhotoConvert("/a.jpg");
    EXPECT_EQ(ModeOf("/var/lib/velaindex"), 0750);
    for (const char* end : {"", "-wal", "-shm"}) {
      EXPECT_EQ(ModeOf(kIndexDatabase + std::string(end)), 0640) << end << " mask " << mask;
    }
    daemon.End(SIGTERM);
  }
}

TEST_F(SharedIndexTest, ThatExistsKeepsItsModes) {
  ASSERT_EQ(RegisterConversion("/before.jpg"), 0);
  ASSERT_EQ(chmod("/var/lib/velaindex", 0711), 0);
  ASSERT_EQ(chmod(kIndexDatabase, 0604), 0);
  const IndexDaemon daemon;
  PostPhotoConvert("/a.jpg");
  EXPECT_EQ(ModeOf("/var/lib/velaindex"), 0711);
  EXPECT_EQ(ModeOf(kIndexDatabase), 0604);
}

TEST_F(SharedIndexTest, MayBeInAnotherPlace) {
  const IndexDaemon daemon({"--database", "/tmp/some/where/index.db"});
  PostPhotoConvert("/a.jpg");
  EXPECT_EQ(Query("SELECT count(*) FROM posted", "/tmp/some/where/index.db"), Rows{"1"});
  EXPECT_FALSE(Exists("/var/lib/velaindex"));
}

TEST_F(SharedIndexTest, IsSharedWithProgramsThatRegisterConversions) {
  ASSERT_EQ(RegisterConversion("/before.jpg"), 0);
  ASSERT_EQ(Query("PRAGMA user_version"), Rows{"1"});
  const IndexDaemon daemon;
  ASSERT_EQ(RegisterConversion("/after.jpg"), 0);
  PostPhotoConvert("/after.jpg");
  EXPECT_EQ(Query("PRAGMA user_version"), Rows{"1"});
  EXPECT_EQ(Query("SELECT count(*) FROM conversion"), Rows{"2"});
  EXPECT_EQ(Query("SELECT count(*) FROM posted"), Rows{"1"});
}

TEST_F(SharedIndexTest, LetsOtherProgramsCreateTheirTables) {
  const IndexDaemon daemon;
  PostPhotoConvert("/a.jpg");
  ASSERT_EQ(RegisterConversion("/a.jpg"), 0);
  EXPECT_EQ(Query("SELECT count(*) FROM conversion"), Rows{"1"});
  PostPhotoConvert("/b.jpg");
  EXPECT_EQ(Query("SELECT count(*) FROM posted"), Rows{"2"});
}

TEST_F(SharedIndexTest, AllWritersGetTheirTurn) {
  const IndexDaemon daemon;
  constexpr int kEach = 100;
  int failures = 0;
  std::thread other = StartQuietThread([&] {
    for (int i = 0; i < kEach; ++i) {
      failures += RegisterConversion("/" + std::to_string(i)) == 0 ? 0 : 1;
    }
  });
  for (int i = 0; i < kEach; ++i) PostPhotoConvert(("/" + std::to_string(i)).c_str());
  other.join();
  EXPECT_EQ(failures, 0);
  EXPECT_EQ(Query("SELECT (SELECT count(*) FROM conversion), (SELECT count(*) FROM posted)"),
            Rows{"100|100"});
}

TEST_F(SharedIndexTest, OfANewerVersionIsNotUsed) {
  {
    IndexDaemon daemon;
    EXPECT_EQ(daemon.End(SIGTERM).exitCode, 0);
  }
  Query("UPDATE velaindexplugind_schema SET version = 2");
  ExpectRefusal({}, "those of a newer velaindexplugind", NoStart::kPermanent);
  EXPECT_FALSE(Exists(PluginDaemonSocketPath));
  EXPECT_EQ(Query("SELECT version FROM velaindexplugind_schema"), Rows{"2"});
}

TEST_F(SharedIndexTest, ThatIsNotADatabaseKeepsTheDaemonFromStarting) {
  WriteFile(kIndexDatabase, std::string(8192, 'x'));
  ExpectRefusal({}, "not a database", NoStart::kPermanent);
  EXPECT_EQ(ReadFile(kIndexDatabase), std::string(8192, 'x'));
}

TEST_F(SharedIndexTest, ThatCannotBeCreatedKeepsTheDaemonFromStarting) {
  ExpectRefusal({"--database", "/proc/none/index.db"}, "/proc/none/index.db", NoStart::kPermanent);
  ExpectRefusal({"--database", "/tmp"}, "/tmp is not a file", NoStart::kPermanent);
}

TEST_F(SharedIndexTest, ThatIsRemovedIsCreatedAgain) {
  const IndexDaemon daemon;
  PostPhotoConvert("/a.jpg");
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  RemoveTree("/var/lib/velaindex");
  PostPhotoConvert("/b.jpg");
  EXPECT_EQ(Query("SELECT CAST(path AS TEXT) FROM posted"), Rows{"/b.jpg"});
  EXPECT_EQ(GetIndexVersion("/a"), 0);
}

TEST_F(SharedIndexTest, ThatIsReplacedIsUsed) {
  {
    IndexDaemon daemon({"--database", "/tmp/new/index.db"});
    ASSERT_TRUE(SetVersion("/photos", 8));
    EXPECT_EQ(daemon.End(SIGTERM).exitCode, 0);
  }
  Query("PRAGMA wal_checkpoint(TRUNCATE)", "/tmp/new/index.db");
  const IndexDaemon daemon;
  ASSERT_EQ(GetIndexVersion("/photos/a.jpg"), 0);
  for (const char* end : {"", "-wal", "-shm"}) RemoveTree(kIndexDatabase + std::string(end));
  CopyFile("/tmp/new/index.db", kIndexDatabase);
  EXPECT_EQ(GetIndexVersion("/photos/a.jpg"), 8);
}

TEST_F(SharedIndexTest, IsIntactAfterTheDaemonIsKilled) {
  for (int round = 0; round < 10; ++round) {
    IndexDaemon daemon;
    std::vector<std::string> answered;
    std::thread client = StartQuietThread([&] {
      for (int i = 0; i < 100000; ++i) {
        const std::string path = "/" + std::to_string(round) + "/" + std::to_string(i);
        Json::Value packet = PathRequest("POST_PHOTO_CONVERT", path);
        if (AutoSendRecvPacket(PluginDaemonSocketPath, -1, packet, 30) != 0) return;
        if (packet["success"] == Json::Value(true)) answered.push_back(path);
      }
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(10 + 7 * round));
    daemon.End(SIGKILL);
    client.join();
    EXPECT_EQ(Query("PRAGMA integrity_check"), Rows{"ok"});
    const std::string count = "SELECT count(*) FROM posted WHERE CAST(path AS TEXT) LIKE '/" +
                              std::to_string(round) + "/%'";
    EXPECT_GE(std::stoul(Query(count).at(0)), answered.size()) << "an answered post is lost";
  }
}

// Also registered with ImageMagick as the converter, see CMakeLists.txt.
class VelathumbTest : public IndexDaemonTest {
 protected:
  static ProgramResult RunVelathumb() {
    const std::string profiles = WriteProfileFile("/tmp/profiles.conf", UsualProfiles());
    return RunProgram(VelathumbPath(), {profiles, "/tmp/photos"});
  }
};

TEST_F(VelathumbTest, PostsItsPhotosAndRegistersTheirThumbnailsInOneIndex) {
  InstallRealConverter();
  MakeDirectories("/tmp/photos");
  MakeJpeg("/tmp/photos/a.jpg");
  MakeJpeg("/tmp/photos/b \xff.jpg");
  IndexDaemon daemon({"--log-requests"});
  EXPECT_EQ(RunVelathumb().exitCode, 0);
  EXPECT_EQ(ErrorLines(), Rows{});
  const Rows both = {"2F746D702F70686F746F732F612E6A7067",
                     "2F746D702F70686F746F732F6220FF2E6A7067"};
  EXPECT_EQ(Query("SELECT hex(path) FROM posted ORDER BY path"), both);
  EXPECT_EQ(Query("SELECT hex(photo_path) FROM conversion ORDER BY photo_path"), both);
  const std::string log = daemon.End(SIGTERM).err;
  EXPECT_THAT(log, HasSubstr("command=GET_INDEX_VERSION path=/tmp/photos/a.jpg outcome=done"));
}

}  // namespace
}  // namespace vela_test
