// The entries of a directory.
#include "posix/directory_entries.h"
#include "posix/cut_text.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/sandbox.h"
#include "support/system_log.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::IsEmpty;

constexpr const char* kDir = "/tmp/dir";

class EntryCount : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories(kDir);
  }
};

TEST_F(EntryCount, HasTheTwoEntriesOfEveryDirectory) {
  EXPECT_EQ(CountDirEntries(kDir), 2);
}

TEST_F(EntryCount, HasEntriesOfAllKindsAndNames) {
  for (const char* name : {"a.jpg", ".hidden", "@eaDir", "#a", "lost+found", "below/a"}) {
    WriteFile(std::string(kDir) + "/" + name, "");
  }
  ASSERT_EQ(symlink("/nowhere", "/tmp/dir/link"), 0);
  ASSERT_EQ(mkfifo("/tmp/dir/pipe", 0600), 0);
  EXPECT_EQ(CountDirEntries(kDir), 10);
}

TEST_F(EntryCount, GoesBeyondOneRead) {
  for (int i = 0; i < 3000; ++i) {
    WriteFile(std::string(kDir) + "/" + std::to_string(i) + std::string(200, 'n'), "");
  }
  EXPECT_EQ(CountDirEntries(kDir), 3002);
}

TEST_F(EntryCount, IsThatOfTheDirectoryBehindALink) {
  WriteFile("/tmp/dir/a", "");
  ASSERT_EQ(symlink(kDir, "/tmp/link"), 0);
  EXPECT_EQ(CountDirEntries("/tmp/link"), 3);
}

TEST_F(EntryCount, IsZeroForWhatIsNoDirectory) {
  WriteFile("/tmp/file", "");
  EXPECT_EQ(CountDirEntries("/tmp/file"), 0);
  EXPECT_EQ(CountDirEntries("/tmp/nowhere"), 0);
  EXPECT_EQ(CountDirEntries(""), 0);
}

TEST_F(EntryCount, IsZeroForADirectoryThatCannotBeOpened) {
  ASSERT_EQ(chmod(kDir, 0333), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(CountDirEntries(kDir), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(EntryCount, LeavesNoDescriptorOpen) {
  const size_t before = ListDirectory("/proc/self/fd").size();
  for (int i = 0; i < 5; ++i) {
    CountDirEntries(kDir);
  }
  EXPECT_EQ(ListDirectory("/proc/self/fd").size(), before);
}

TEST(EntryPath, IsThatOfDirectoryAndName) {
  EXPECT_EQ(vela::JoinPath("/tmp/a", "b"), "/tmp/a/b");
  EXPECT_EQ(vela::JoinPath("/tmp/a/", "b"), "/tmp/a//b");
}

TEST(EntryPath, IsCutToAPathsLength) {
  const std::string dir = "/" + std::string(4089, 'd');
  EXPECT_EQ(vela::JoinPath(dir.c_str(), "1234"), dir + "/1234");
  EXPECT_EQ(vela::JoinPath(dir.c_str(), "12345"), dir + "/1234");
  EXPECT_EQ(vela::JoinPath(dir.c_str(), std::string(255, '1').c_str()), dir + "/1111");
}

}  // namespace
}  // namespace vela_test
