// Files in directories that other users can change.
#include "posix/folder.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <ctime>
#include <string>
#include <thread>

#include "support/files.h"
#include "support/other_user.h"
#include "support/quiet_test.h"
#include "support/users.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;

constexpr const char* kTop = "/tmp/top";
constexpr uid_t kUser = 1;
constexpr uid_t kOtherUser = 2;

std::string In(const std::string& name) {
  return std::string(kTop) + "/" + name;
}

/// Makes a link that belongs to the user.
void MakeLink(const std::string& target, const std::string& path, uid_t owner) {
  ASSERT_EQ(symlink(target.c_str(), path.c_str()), 0);
  ASSERT_EQ(lchown(path.c_str(), owner, owner), 0);
}

int Examine(const std::string& path) {
  struct stat status = {};
  return FolderEntry(path).Examine(status);
}

class Folder : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    MakeDirectories(kTop);
  }

  /// Makes a file of the user at `path`.
  static void MakeFileOf(uid_t owner, const std::string& path) {
    WriteFile(path, "content");
    ASSERT_EQ(chown(path.c_str(), owner, owner), 0);
  }
};

TEST_F(Folder, EntriesAreFoundUnderAnyFormOfTheirPath) {
  WriteFile(In("file"), "content");
  MakeDirectories(In("sub"));
  for (const std::string& path : {In("file"), In("/file"), In("./file"), In("sub/../file")}) {
    EXPECT_EQ(Examine(path), 0) << path;
  }
  for (const char* path : {"/", "/tmp", "/tmp/", "//tmp//top//", "/tmp/top/."}) {
    EXPECT_EQ(Examine(path), 0) << path;
  }
  ASSERT_EQ(chdir(kTop), 0);
  EXPECT_EQ(Examine("file"), 0);
  EXPECT_EQ(Examine("."), 0);
  EXPECT_EQ(Examine(".."), 0);
  ASSERT_EQ(chdir("/"), 0);
}

TEST_F(Folder, AMissingOneFailsAsTheSystemDoes) {
  WriteFile(In("file"), "content");
  const struct {
    std::string path;
    int error;
  } cases[] = {{"", ENOENT},
               {In("absent"), ENOENT},
               {In("absent/file"), ENOENT},
               {In("file/below"), ENOTDIR},
               {In(std::string(300, 'x')), ENAMETOOLONG},
               {In("") + std::string(4096, '/') + "file", ENAMETOOLONG}};
  for (const auto& one : cases) {
    EXPECT_EQ(Examine(one.path), one.error) << one.path.substr(0, 40);
    EXPECT_EQ(FolderEntry(one.path).Remove(), one.error) << one.path.substr(0, 40);
    EXPECT_FALSE(FolderEntry(one.path).Open(O_RDONLY).IsOpen());
  }
}

TEST_F(Folder, HonestLinksAreFollowed) {
  if (!HasOtherUsers()) {
    return;  // every file belongs to the only user
  }
  MakeFileOf(kUser, In("file"));
  MakeLink("file", In("of_root"), 0);
  MakeLink("file", In("of_the_owner"), kUser);
  MakeLink(In("of_the_owner"), In("chain"), 0);
  MakeDirectories(In("sub/deep"));
  ASSERT_EQ(lchown(In("sub").c_str(), kUser, kUser), 0);
  MakeLink("sub", In("directory"), kUser);
  WriteFile(In("sub/deep/file"), "");
  for (const char* name : {"of_root", "of_the_owner", "chain", "directory/deep/file",
                           "directory/deep/../deep/file", "directory/", "directory/."}) {
    EXPECT_EQ(Examine(In(name)), 0) << name;
    EXPECT_TRUE(FolderEntry(In(name)).Open(O_RDONLY).IsOpen()) << name;
  }
}

TEST_F(Folder, LinksToTheFilesOfOthersAreNotFollowed) {
  if (!HasOtherUsers()) {
    return;  // every file belongs to the only user
  }
  MakeFileOf(kOtherUser, "/tmp/private/file");
  ASSERT_EQ(chown("/tmp/private", kOtherUser, kOtherUser), 0);
  MakeLink("/tmp/private/file", In("file"), kUser);
  MakeLink("/tmp/private", In("directory"), kUser);
  MakeLink(In("file"), In("honest_link_to_it"), 0);
  for (const char* name : {"file", "directory", "directory/file", "honest_link_to_it"}) {
    EXPECT_EQ(Examine(In(name)), ELOOP) << name;
    EXPECT_FALSE(FolderEntry(In(name)).Open(O_RDONLY).IsOpen()) << name;
    EXPECT_EQ(errno, ELOOP) << name;
  }
  EXPECT_EQ(FolderEntry(In("directory/new")).CreateDirectory(0777), ELOOP);
  EXPECT_EQ(FolderEntry(In("directory/file")).Remove(), ELOOP);
  EXPECT_FALSE(FolderEntry(In("directory/new")).Create(0666).IsOpen());
  EXPECT_EQ(OpenDirectoryStream(In("directory")), nullptr);
  EXPECT_THAT(ListDirectory("/tmp/private"), ElementsAre("file"));
}

TEST_F(Folder, LoopsOfLinksEnd) {
  MakeLink("loop", In("loop"), 0);
  MakeLink("b", In("a"), 0);
  MakeLink("a", In("b"), 0);
  EXPECT_EQ(Examine(In("loop")), ELOOP);
  EXPECT_EQ(Examine(In("a/file")), ELOOP);
}

TEST_F(Folder, NothingIsCreatedThroughALink) {
  MakeLink("/tmp/nowhere", In("link"), 0);
  EXPECT_FALSE(FolderEntry(In("link")).Create(0666).IsOpen());
  EXPECT_EQ(errno, EEXIST);
  EXPECT_TRUE(FolderEntry(In("link")).CreateAnew(0640).IsOpen());
  EXPECT_EQ(ModeOf(In("link")), 0640);
  EXPECT_FALSE(Exists("/tmp/nowhere"));
}

TEST_F(Folder, OnlyFilesThatNobodyElseHasPlantedAreItsOwn) {
  if (!HasOtherUsers()) {
    return;  // every file belongs to the only user
  }
  WriteFile(In("own"), "");
  MakeFileOf(kUser, In("foreign"));
  WriteFile(In("two_names"), "");
  ASSERT_EQ(link(In("two_names").c_str(), In("second_name").c_str()), 0);
  MakeLink("own", In("link"), 0);
  MakeDirectories(In("directory"));
  ASSERT_EQ(mkfifo(In("pipe").c_str(), 0666), 0);
  EXPECT_TRUE(FolderEntry(In("own")).OpenOwn().IsOpen());
  for (const char* name :
       {"foreign", "two_names", "second_name", "link", "directory", "pipe", "absent"}) {
    EXPECT_FALSE(FolderEntry(In(name)).OpenOwn().IsOpen()) << name;
  }
}

TEST_F(Folder, FilesFromBeforeAreNotItsOwn) {
  WriteFile(In("private"), "precious");
  struct stat old = {};
  ASSERT_EQ(stat(In("private").c_str(), &old), 0);
  // Until the times of files differ enough.
  while (std::time(nullptr) < old.st_ctime + 4) {
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
  }
  EXPECT_TRUE(FolderEntry(In("private")).OpenOwn().IsOpen());
  const std::string name = FindUnusedPath(In("output.XXXXXX"));
  ASSERT_EQ(rename(In("private").c_str(), name.c_str()), 0);
  EXPECT_FALSE(FolderEntry(name).OpenOwn().IsOpen());
  WriteFile(In("new"), "output");
  EXPECT_TRUE(FolderEntry(In("new")).OpenOwn().IsOpen());
}

TEST_F(Folder, ATargetIsNotOpenedBeforeItsLinkIsTrusted) {
  if (!HasOtherUsers()) {
    return;  // every file belongs to the only user
  }
  MakeLink("/dev/full", In("link"), kUser);
  EXPECT_FALSE(FolderEntry(In("link")).Open(O_RDONLY).IsOpen());
  EXPECT_EQ(errno, ELOOP);
}

TEST_F(Folder, IsInPlaceUntilItIsRenamed) {
  const HeldFolder held(kTop);
  EXPECT_TRUE(IsInPlace(kTop));
  ASSERT_EQ(rename(kTop, "/tmp/moved"), 0);
  EXPECT_FALSE(IsInPlace(kTop));
  MakeDirectories(kTop);
  EXPECT_FALSE(IsInPlace(kTop));
  EXPECT_TRUE(IsInPlace("/tmp/moved")) << "not held under this path";
}

TEST_F(Folder, StaysTheSameWhileItIsHeld) {
  if (!HasOtherUsers()) {
    return;  // every file belongs to the only user
  }
  LiftProtectionOfTmp();
  MakeFileOf(0, "/tmp/elsewhere/file");
  WriteFile(In("file"), "held");
  {
    const HeldFolder held(kTop);
    EXPECT_EQ(held.Error(), 0);
    ASSERT_EQ(rename(kTop, "/tmp/moved"), 0);
    MakeLink("/tmp/elsewhere", kTop, kUser);
    EXPECT_EQ(FolderEntry(In("file")).Remove(), 0);
    EXPECT_EQ(FolderEntry(In("new")).CreateDirectory(0777), 0);
    EXPECT_EQ(FolderEntry(In("new")).RenameTo(FolderEntry(In("newer"))), 0);
  }
  EXPECT_THAT(ListDirectory("/tmp/elsewhere"), ElementsAre("file"));
  EXPECT_THAT(ListDirectory("/tmp/moved"), ElementsAre("newer"));
  EXPECT_EQ(Examine(In("file")), ELOOP);
}

TEST_F(Folder, AHeldOneInAHeldOneIsReachedThroughIt) {
  MakeDirectories(In("sub"));
  WriteFile(In("sub/file"), "");
  const HeldFolder top(kTop);
  ASSERT_EQ(rename(kTop, "/tmp/moved"), 0);
  const HeldFolder sub(In("sub"));
  EXPECT_EQ(sub.Error(), 0);
  EXPECT_TRUE(IsInHeldFolder(In("sub/file")));
  EXPECT_FALSE(IsInHeldFolder(In("sub/deeper/file")));
  EXPECT_EQ(Examine(In("sub/file")), 0);
}

TEST_F(Folder, ItsListingIsThatOfTheHeldDirectory) {
  WriteFile(In("file"), "");
  const HeldFolder held(kTop);
  ASSERT_EQ(rename(kTop, "/tmp/moved"), 0);
  DIR* const stream = OpenDirectoryStream(kTop);
  ASSERT_NE(stream, nullptr);
  int count = 0;
  while (readdir(stream) != nullptr) {
    ++count;
  }
  closedir(stream);
  EXPECT_EQ(count, 3);
}

TEST_F(Folder, APipeIsNeverWaitedFor) {
  ASSERT_EQ(mkfifo(In("pipe").c_str(), 0666), 0);
  EXPECT_TRUE(FolderEntry(In("pipe")).Open(O_RDONLY).IsOpen());
  EXPECT_FALSE(FolderEntry(In("pipe")).Open(O_WRONLY).IsOpen());
}

TEST_F(Folder, LeavesNoDescriptor) {
  WriteFile(In("file"), "");
  MakeLink("file", In("link"), 0);
  const size_t before = ListDirectory("/proc/self/fd").size();
  for (int i = 0; i < 20; ++i) {
    const HeldFolder held(kTop);
    Examine(In("link"));
    Examine(In("absent/file"));
    FindUnusedPath(In("name.XXXXXX"));
  }
  EXPECT_EQ(ListDirectory("/proc/self/fd").size(), before);
}

TEST_F(Folder, ScratchDirectoryIsPrivateAndGoesWithItsFiles) {
  std::string path;
  {
    const ScratchDirectory scratch;
    path = scratch.Path();
    ASSERT_EQ(path.find("/tmp/velathumb."), 0U);
    struct stat status = {};
    ASSERT_EQ(lstat(path.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode, S_IFDIR | 0700U);
    WriteFile(In("kept"), "content");
    WriteFile(path + "/file", "content");
    ASSERT_EQ(symlink(In("kept").c_str(), (path + "/link").c_str()), 0);
    const ScratchDirectory other;
    EXPECT_NE(other.Path(), path);
  }
  EXPECT_FALSE(Exists(path));
  EXPECT_TRUE(Exists(In("kept")));
}

/// Runs in a child, which it ends.
void EndWithScratchDirectory(int signal) {
  {
    const ScratchDirectory scratch;
    WriteFile(scratch.Path() + "/file", "content");
    raise(signal);
  }
  _exit(0);
}

TEST_F(Folder, ScratchDirectoryIsNotLeftBehindByASignal) {
  const std::vector<std::string> before = ListDirectory("/tmp");
  for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
    EXPECT_EXIT(EndWithScratchDirectory(signal), ::testing::KilledBySignal(signal), "");
    EXPECT_EQ(ListDirectory("/tmp"), before) << signal;
  }
}

}  // namespace
}  // namespace vela_test
