// Other users, watched folders and records of trees.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <unistd.h>

#include "support/files.h"
#include "support/folder_watch.h"
#include "support/other_user.h"
#include "support/sandbox.h"
#include "support/tree_record.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

using HostileSupportTest = SandboxTest;

TEST_F(HostileSupportTest, ActsWithAnotherIdentity) {
  MakeDirectories("/tmp/open");
  ActAs(kAttacker, [] {
    WriteFile("/tmp/open/file", "");
    return true;
  });
  struct stat status {};
  ASSERT_EQ(stat("/tmp/open/file", &status), 0);
  EXPECT_EQ(status.st_uid, HasOtherUsers() ? kAttacker : 0);
  EXPECT_EQ(status.st_gid, HasOtherUsers() ? kAttacker : 0);
}

TEST_F(HostileSupportTest, OtherUsersHaveNoPrivileges) {
  WriteFile("/tmp/private", "");
  chmod("/tmp/private", 0600);
  ActAs(kAttacker, [] { return (access("/tmp/private", R_OK) == 0) != HasOtherUsers(); });
}

TEST_F(HostileSupportTest, ProcessesEndWithTheirObject) {
  MakeDirectories("/tmp/open");
  {
    const UserProcess process(kAttacker, [] {
      for (;;) {
        WriteFile("/tmp/open/alive", "");
      }
    });
    EXPECT_TRUE(WaitUntilExists("/tmp/open/alive"));
  }
  RemoveTree("/tmp/open/alive");
  EXPECT_FALSE(WaitUntilExists("/tmp/open/alive", 50));
}

TEST_F(HostileSupportTest, FolderWatchTellsWhatHappens) {
  MakeDirectories("/tmp/open");
  const FolderWatch watch({"/tmp/open"}, IN_CREATE);
  const UserProcess process(kAttacker, [&watch] {
    watch.Follow([](const std::string& path, uint32_t event) {
      if (path == "/tmp/open/file" && event == IN_CREATE) {
        WriteFile("/tmp/open/seen", "");
      }
    });
  });
  WriteFile("/tmp/open/file", "");
  EXPECT_TRUE(WaitUntilExists("/tmp/open/seen"));
}

TEST_F(HostileSupportTest, RecordsDifferInEveryProperty) {
  const std::string file = "/tmp/tree/file";
  WriteFile(file, "text");
  chmod(file.c_str(), 0666);
  SetFileTime(file, 1000);
  const TreeRecord before = RecordTree("/tmp/tree");
  EXPECT_THAT(Differences(before, RecordTree("/tmp/tree")), IsEmpty());
  chmod(file.c_str(), 0600);
  EXPECT_EQ(Differences(before, RecordTree("/tmp/tree")).size(), 1U);
  chmod(file.c_str(), 0666);
  WriteFile(file, "TEXT");
  SetFileTime(file, 1000);
  EXPECT_EQ(Differences(before, RecordTree("/tmp/tree")).size(), 1U);
  WriteFile(file, "text");
  SetFileTime(file, 1000, 1);
  EXPECT_EQ(Differences(before, RecordTree("/tmp/tree")).size(), 1U);
  SetFileTime(file, 1000);
  WriteFile("/tmp/tree/new", "");
  // The directory's modification time has changed as well.
  EXPECT_EQ(Differences(before, RecordTree("/tmp/tree")).size(), 2U);
}

TEST_F(HostileSupportTest, RecordsWithoutDetailShowNamesAndModes) {
  const std::string file = "/tmp/tree/file";
  WriteFile(file, "text");
  const TreeRecord before = RecordTree("/tmp/tree", RecordDetail::kNone);
  WriteFile(file, "TEXT");
  SetFileTime(file, 1000);
  EXPECT_THAT(Differences(before, RecordTree("/tmp/tree", RecordDetail::kNone)), IsEmpty());
  chmod(file.c_str(), 0600);
  EXPECT_THAT(Differences(before, RecordTree("/tmp/tree", RecordDetail::kNone)),
              ElementsAre(::testing::HasSubstr("'file' was")));
}

}  // namespace
}  // namespace vela_test
