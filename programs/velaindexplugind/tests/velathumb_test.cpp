// velathumb with the daemon at its side.
#include <csignal>
#include <string>
#include <vector>

#include "index_daemon.h"
#include "support/build_paths.h"
#include "support/files.h"
#include "support/images.h"
#include "support/profile_file.h"
#include "support/stub_tool.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using Rows = std::vector<std::string>;

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
  EXPECT_NE(log.find("command=GET_INDEX_VERSION path=/tmp/photos/a.jpg outcome=done"),
            std::string::npos);
}

}  // namespace
}  // namespace vela_test
