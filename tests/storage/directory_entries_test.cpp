// The entries of a directory and walks through the directories of a tree.
#include <sys/stat.h>
#include <unistd.h>

#include <stdexcept>

#include "posix/truncated_text.h"
#include "storage/directory_tree.h"
#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/quiet_test.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::UnorderedElementsAre;

constexpr const char* kDir = "/tmp/dir";

class EntryCount : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
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

TEST_F(EntryCount, IsNotLimitedToOneRead) {
  for (int i = 0; i < 3000; ++i) {
    WriteFile(std::string(kDir) + "/" + std::to_string(i) + std::string(200, 'n'), "");
  }
  EXPECT_EQ(CountDirEntries(kDir), 3002);
}

TEST_F(EntryCount, FollowsALinkToADirectory) {
  WriteFile("/tmp/dir/a", "");
  ASSERT_EQ(symlink(kDir, "/tmp/link"), 0);
  EXPECT_EQ(CountDirEntries("/tmp/link"), 3);
}

TEST_F(EntryCount, IsZeroForAnythingButADirectory) {
  WriteFile("/tmp/file", "");
  EXPECT_EQ(CountDirEntries("/tmp/file"), 0);
  EXPECT_EQ(CountDirEntries("/tmp/nowhere"), 0);
  EXPECT_EQ(CountDirEntries(""), 0);
}

TEST_F(EntryCount, IsZeroForADirectoryThatCannotBeOpened) {
  ASSERT_EQ(chmod(kDir, 0333), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(CountDirEntries(kDir), 0);
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

constexpr const char* kTop = "/tmp/tree";

class DirectoryTree : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    MakeDirectories("/tmp/tree/a/b/c/d");
  }

  /// The directories visited before and including this one, at which the visitor throws.
  static std::vector<std::string> VisitedUntil(const std::string& last) {
    std::vector<std::string> visited;
    const auto visit = [&](const char* path, bool /*isReadable*/) {
      visited.emplace_back(path);
      if (path == last) {
        throw std::runtime_error("enough at " + last);
      }
    };
    try {
      EXPECT_EQ(ForEachIndexedDirectory(kTop, visit), 0);
      EXPECT_NE(visited.back(), last) << "the exception was lost";
    } catch (const std::runtime_error& error) {
      EXPECT_EQ(error.what(), "enough at " + last);
    }
    return visited;
  }
};

TEST_F(DirectoryTree, AVisitorThatThrowsEndsTheWalkWithItsException) {
  EXPECT_THAT(VisitedUntil("/tmp/tree/a/b"), ElementsAre(kTop, "/tmp/tree/a", "/tmp/tree/a/b"));
  const auto visit = [](const char* /*path*/, bool /*isReadable*/) { throw 42; };
  EXPECT_THROW(ForEachIndexedDirectory(kTop, visit), int);
}

TEST_F(DirectoryTree, AVisitorThatThrowsLeavesNoDescriptorOpen) {
  const std::vector<std::string> before = ListDirectory("/proc/self/fd");
  for (const char* last : {"/tmp/tree", "/tmp/tree/a/b", "/tmp/tree/a/b/c/d"}) {
    VisitedUntil(last);
    EXPECT_EQ(ListDirectory("/proc/self/fd"), before) << last;
  }
}

TEST_F(DirectoryTree, TheNextWalkIsComplete) {
  VisitedUntil("/tmp/tree/a/b");
  EXPECT_THAT(VisitedUntil(""), UnorderedElementsAre(kTop, "/tmp/tree/a", "/tmp/tree/a/b",
                                                     "/tmp/tree/a/b/c", "/tmp/tree/a/b/c/d"));
}

}  // namespace
}  // namespace vela_test
