// The walk through a tree that others may change.
#include "posix/tree_walk.h"

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <map>
#include <set>
#include <stdexcept>
#include <thread>

#include "storage/deep_files.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/named_case.h"
#include "support/privileges.h"
#include "support/quiet_test.h"
#include "support/users.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::IsSupersetOf;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;
using Strings = std::vector<std::string>;

constexpr const char* kTop = "/tmp/tree";
constexpr uid_t kUser = 1000;
constexpr uid_t kOther = 2000;

std::string In(const std::string& name) {
  return std::string(kTop) + "/" + name;
}

void Link(const std::string& target, const std::string& name) {
  ASSERT_EQ(symlink(target.c_str(), In(name).c_str()), 0) << name;
}

struct Visit {
  int typeFlag;
  std::string path;
  std::string name;  ///< the path from the reported base
  int level;
  ino_t inode;  ///< of directories that were opened
};
bool operator==(const Visit& a, const Visit& b) {
  return a.typeFlag == b.typeFlag && a.path == b.path && a.name == b.name && a.level == b.level &&
         a.inode == b.inode;
}
void PrintTo(const Visit& visit, std::ostream* out) {
  *out << visit.typeFlag << " " << visit.path << " (" << visit.name << "), level " << visit.level
       << ", inode " << visit.inode;
}

std::vector<Visit> g_visits;

/// Records everything but the files, which only the C library's walk reports.
int Record(const char* path, const struct stat* status, int typeFlag, struct FTW* place) {
  if (typeFlag != FTW_F) {
    g_visits.push_back(
        {typeFlag, path, path + place->base, place->level, typeFlag == FTW_D ? status->st_ino : 0});
  }
  return FTW_CONTINUE;
}

class TreeWalk : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    MakeDirectories(kTop);
    g_visits.clear();
  }

  static std::vector<Visit> VisitsOfLibrary(const char* root) {
    g_visits.clear();
    EXPECT_EQ(nftw(root, Record, 100, FTW_ACTIONRETVAL | FTW_MOUNT), 0);
    return std::move(g_visits);
  }

  static std::vector<Visit> Visits(const char* root) {
    g_visits.clear();
    EXPECT_EQ(WalkTree(root, Record), 0);
    return std::move(g_visits);
  }

  /// Walks the tree and returns the directories, without the root, in the order of their reports.
  static Strings Directories(int expectedResult = 0, const std::string& root = kTop,
                             const std::function<void(const std::string&)>& onVisit = {}) {
    Strings found;
    const auto step = [&](const char* path, const struct stat*, int typeFlag, struct FTW* place) {
      if (typeFlag == FTW_D && place->level > 0) {
        found.push_back(std::string(path).substr(root.size() + 1));
      }
      if (typeFlag == FTW_D && onVisit) {
        onVisit(path);
      }
      return FTW_CONTINUE;
    };
    EXPECT_EQ(WalkTree(root.c_str(), step), expectedResult);
    return found;
  }

  static std::map<std::string, int> TypeFlags() {
    std::map<std::string, int> flags;
    for (const Visit& visit : Visits(kTop)) {
      flags[visit.name] = visit.typeFlag;
    }
    return flags;
  }
};

/// A tree with everything that an honest one has.
void MakeHonestTree() {
  for (int i = 0; i < 12; ++i) {
    for (int j = 0; j < 5; ++j) {
      const std::string dir = In(std::to_string(i * 7919 % 100) + "/" + std::to_string(j));
      MakeDirectories(dir + "/@eaDir/photo.jpg");
      WriteFile(dir + "/photo.jpg", "photo");
    }
  }
  MakeDirectories("/tmp/elsewhere/below");
  Link("/tmp/elsewhere", "absolute");
  Link("../../tree/0/1", "0/relative");
  Link("..", "0/1/up");
  Link("/tmp/tree", "0/2/top");
  Link("0/3/photo.jpg", "file");
  Link("nowhere", "dangling");
}

TEST_F(TreeWalk, ReportsAnHonestTreeAsTheLibraryDoes) {
  MakeHonestTree();
  const SmallVolume volume(In("0/volume"), 1 << 20);
  MakeDirectories(In("0/volume/below"));
  const std::vector<Visit> expected = VisitsOfLibrary(kTop);
  ASSERT_THAT(expected, SizeIs(1 + 12 + 3 * 12 * 5 + 2 + 1));
  EXPECT_EQ(Visits(kTop), expected);
}

TEST_F(TreeWalk, ReportsClosedDirectoriesAsTheLibraryDoes) {
  MakeDirectories(In("closed/below"));
  MakeDirectories(In("listed/below"));
  MakeDirectories(In("open/below"));
  ASSERT_EQ(chmod(In("closed").c_str(), 0333), 0);
  ASSERT_EQ(chmod(In("listed").c_str(), 0444), 0);
  const WithoutCapabilities ordinary;
  const std::vector<Visit> expected = VisitsOfLibrary(kTop);
  ASSERT_THAT(expected, SizeIs(6));
  EXPECT_EQ(Visits(kTop), expected);
}

class EachRoot : public TreeWalk, public ::testing::WithParamInterface<const char*> {};

TEST_P(EachRoot, IsReportedAsTheLibraryDoes) {
  MakeDirectories(In("sub/below"));
  ASSERT_EQ(symlink(kTop, "/tmp/link"), 0);
  ASSERT_EQ(chdir("/tmp/tree"), 0);
  const std::vector<Visit> expected = VisitsOfLibrary(GetParam());
  ASSERT_GE(expected.size(), 2U);
  EXPECT_EQ(Visits(GetParam()), expected);
  ASSERT_EQ(chdir("/"), 0);
}

INSTANTIATE_TEST_SUITE_P(Roots, EachRoot,
                         ::testing::Values("/tmp/tree", "/tmp/tree///", "/tmp//tree", "/tmp/link",
                                           "sub", "sub/", ".", "..", "./sub", "../tree/sub"));

TEST_F(TreeWalk, TheRootOfTheMachineHasAnEmptyName) {
  Strings names;
  EXPECT_EQ(WalkTree("//",
                     [&](const char* path, const struct stat*, int, struct FTW* place) {
                       names = {path, path + place->base};
                       return FTW_SKIP_SUBTREE;
                     }),
            0);
  EXPECT_THAT(names, ElementsAre("/", ""));
}

TEST_F(TreeWalk, ARootThatIsNoDirectoryIsReportedAsAFile) {
  WriteFile(In("file"), "");
  int flag = -1;
  EXPECT_EQ(WalkTree(In("file").c_str(),
                     [&](const char*, const struct stat*, int typeFlag, struct FTW*) {
                       flag = typeFlag;
                       return FTW_SKIP_SUBTREE;
                     }),
            0);
  EXPECT_EQ(flag, FTW_F);
}

TEST_F(TreeWalk, AMissingRootIsAFailure) {
  const std::pair<std::string, int> roots[] = {
      {"", ENOENT}, {"/tmp/nowhere", ENOENT}, {"/tmp/" + std::string(300, 'n'), ENAMETOOLONG}};
  for (const auto& [root, error] : roots) {
    errno = 0;
    EXPECT_EQ(WalkTree(root.c_str(), Record), -1) << root;
    EXPECT_EQ(errno, error) << root;
  }
  EXPECT_THAT(g_visits, IsEmpty());
}

/// The directories below `dir` in the order in which the system lists them.
void ListInOrder(const std::string& dir, Strings& found) {
  for (const auto& entry : std::filesystem::directory_iterator(dir)) {
    if (entry.is_directory()) {
      found.push_back(entry.path().string().substr(std::string(kTop).size() + 1));
      ListInOrder(entry.path(), found);
    }
  }
}

TEST_F(TreeWalk, TheOrderIsThatOfTheSystem) {
  for (int i = 0; i < 500; ++i) {
    MakeDirectories(In(std::to_string(i * 7919 % 500) + "/" + std::to_string(i * 31 % 7)));
    WriteFile(In(std::to_string(i) + ".jpg"), "");
  }
  Strings expected;
  ListInOrder(kTop, expected);
  ASSERT_THAT(expected, SizeIs(1000));
  EXPECT_EQ(Directories(), expected);
}

TEST_F(TreeWalk, AListOfAnyLengthIsReadToItsEnd) {
  for (int i = 0; i < 2000; ++i) {
    MakeDirectories(In(std::to_string(i) + std::string(200, 'n')));
  }
  EXPECT_THAT(Directories(), SizeIs(2000));
}

// What ended the walk.

struct Obstacle : NamedCase {
  std::vector<std::pair<std::string, std::string>> links;  ///< target, name
  int typeFlag;                                            ///< reported for the first link
};

class EachLink : public TreeWalk, public ::testing::WithParamInterface<Obstacle> {};

TEST_P(EachLink, DoesNotEndTheWalk) {
  // Whatever the order, one of the directories follows the links.
  MakeDirectories(In("1/below"));
  WriteFile(In("file"), "");
  for (const auto& [target, name] : GetParam().links) {
    Link(target, name);
  }
  MakeDirectories(In("2/below"));
  EXPECT_THAT(Directories(), UnorderedElementsAre("1", "1/below", "2", "2/below"));
  EXPECT_EQ(TypeFlags()[GetParam().links[0].second], GetParam().typeFlag);
}

INSTANTIATE_TEST_SUITE_P(
    Links, EachLink,
    ::testing::Values(Obstacle{"ToItself", {{"loop", "loop"}}, FTW_SLN},
                      Obstacle{"ToItselfByAnAbsolutePath", {{"/tmp/tree/loop", "loop"}}, FTW_SLN},
                      Obstacle{"OfTwo", {{"b", "a"}, {"a", "b"}}, FTW_SLN},
                      Obstacle{"OfThree", {{"b", "a"}, {"c", "b"}, {"a", "c"}}, FTW_SLN},
                      Obstacle{"BelowItself", {{"loop/below", "loop"}}, FTW_SLN},
                      Obstacle{"BelowAFile", {{"file/below", "link"}}, FTW_SLN},
                      Obstacle{
                          "WithANameThatIsTooLong", {{std::string(300, 'n'), "link"}}, FTW_SLN}),
    CaseName());

TEST_F(TreeWalk, LinksToDirectoriesAboveEnd) {
  MakeDirectories(In("a/b"));
  Link("..", "a/b/up");
  Link(".", "a/b/here");
  Link("/tmp/tree", "a/b/top");
  Link("/tmp", "a/b/above");
  const Strings found = Directories();
  EXPECT_THAT(found, IsSupersetOf({"a", "a/b", "a/b/above"}));
  EXPECT_THAT(found, SizeIs(3));
}

TEST_F(TreeWalk, PipesAreNotOpened) {
  ASSERT_EQ(mkfifo(In("pipe").c_str(), 0666), 0);
  Link("pipe", "link");
  MakeDirectories(In("below"));
  EXPECT_THAT(Directories(), ElementsAre("below"));
}

TEST_F(TreeWalk, AVolumeMountedOnADirectoryIsNotEnteredByALinkEither) {
  const SmallVolume volume(In("volume"), 1 << 20);
  MakeDirectories(In("volume/below"));
  Link("volume/below", "link");
  EXPECT_THAT(Directories(), IsEmpty());
}

TEST_F(TreeWalk, ADirectoryMountedInsideItselfIsReportedOnce) {
  MakeDirectories(In("a/inner"));
  ASSERT_EQ(mount(kTop, In("a/inner").c_str(), nullptr, MS_BIND, nullptr), 0);
  EXPECT_THAT(Directories(), ElementsAre("a"));
  ASSERT_EQ(umount2(In("a/inner").c_str(), MNT_DETACH), 0);
}

// Links of other users.

struct Owners : NamedCase {
  uid_t link;
  uid_t target;
  bool isFollowed;
};

class EachOwner : public TreeWalk, public ::testing::WithParamInterface<Owners> {};

TEST_P(EachOwner, DecidesWhetherALinkIsFollowed) {
  MakeDirectories("/tmp/target/below");
  Link("/tmp/target", "link");
  const bool isGiven = lchown(In("link").c_str(), GetParam().link, 0) == 0 &&
                       lchown("/tmp/target", GetParam().target, 0) == 0;
  EXPECT_TRUE(isGiven || !HasOtherUsers());
  const bool isFollowed = GetParam().isFollowed || !isGiven;
  EXPECT_EQ(Directories(), isFollowed ? Strings({"link", "link/below"}) : Strings());
  EXPECT_EQ(TypeFlags()["link"], isFollowed ? FTW_D : FTW_SL);
}

INSTANTIATE_TEST_SUITE_P(Owners, EachOwner,
                         ::testing::Values(Owners{"LinkOfUser0ToUser0", 0, 0, true},
                                           Owners{"LinkOfUser0ToAUser", 0, kUser, true},
                                           Owners{"LinkOfAUserToTheUser", kUser, kUser, true},
                                           Owners{"LinkOfAUserToAnother", kUser, kOther, false},
                                           Owners{"LinkOfAUserToUser0", kUser, 0, false}),
                         CaseName());

/// Exchanges a link and a directory without end.
class Exchanger {
 public:
  Exchanger(std::string a, std::string b)
      : thread_([this, a = std::move(a), b = std::move(b)] {
          while (!isDone_) {
            renameat2(AT_FDCWD, a.c_str(), AT_FDCWD, b.c_str(), RENAME_EXCHANGE);
          }
        }) {}
  ~Exchanger() {
    isDone_ = true;
    thread_.join();
  }
  Exchanger(const Exchanger&) = delete;
  Exchanger& operator=(const Exchanger&) = delete;

 private:
  std::atomic<bool> isDone_ = false;
  std::thread thread_;
};

TEST_F(TreeWalk, AForeignLinkThatReplacesADirectoryIsNotFollowed) {
  if (!HasOtherUsers()) {
    return;  // there are no foreign links
  }
  MakeDirectories("/tmp/private/below");
  ASSERT_EQ(chown("/tmp/private", kOther, 0), 0);
  for (const char* name : {"x", "trusted"}) {
    MakeDirectories(In(name));
    Link("/tmp/private", std::string(name) + ".foreign");
    ASSERT_EQ(lchown(In(std::string(name) + ".foreign").c_str(), kUser, 0), 0);
  }
  RemoveTree(In("trusted"));
  MakeDirectories("/tmp/public");
  Link("/tmp/public", "trusted");
  const Exchanger one(In("x"), In("x.foreign"));
  const Exchanger two(In("trusted"), In("trusted.foreign"));
  std::set<std::string> found;
  for (int i = 0; i < 5000; ++i) {
    for (const std::string& path : Directories()) {
      found.insert(path.substr(path.find('/') + 1));
    }
  }
  EXPECT_THAT(found, ::testing::IsSubsetOf({"x", "x.foreign", "trusted", "trusted.foreign"}));
}

// Depth.

TEST_F(TreeWalk, TheDepthIsNotLimited) {
  const DeepTree tree(kTop, "d", 30000, "file");
  EXPECT_THAT(Directories(), SizeIs(30000));
}

TEST_F(TreeWalk, TheLengthOfAPathIsNotLimited) {
  const DeepTree tree(kTop, std::string(200, 'd'), 60, "file");
  MakeDirectories(In("other"));
  const Strings found = Directories();
  EXPECT_THAT(found, SizeIs(61));
  EXPECT_THAT(found, ::testing::Contains("other"));
}

/// A chain of directories "d", each with the directories "1" and "2" beside it, of which one
/// follows in any order.
class Chain : public TreeWalk {
 protected:
  static constexpr int kDepth = 150;

  void SetUp() override {
    TreeWalk::SetUp();
    std::string dir = kTop;
    for (int level = 1; level <= kDepth; ++level) {
      MakeDirectories(dir + "/1");
      MakeDirectories(dir + "/d");
      MakeDirectories(dir + "/2");
      dir += "/d";
    }
  }

  static std::string Path(int depth) {
    std::string path = kTop;
    for (int level = 0; level < depth; ++level) {
      path += "/d";
    }
    return path;
  }

  static void Move(const std::string& from, const std::string& to) {
    EXPECT_EQ(rename(from.c_str(), to.c_str()), 0) << to;
  }

  /// Walks with `action` at the bottom of the chain.
  static Strings WalkWith(const std::function<void()>& action, int expectedResult = 0) {
    const std::string bottom = Path(kDepth);
    return Directories(expectedResult, kTop, [&](const std::string& path) {
      if (path == bottom) {
        action();
      }
    });
  }
};

TEST_F(Chain, FewDescriptorsAreOpen) {
  const size_t before = ListDirectory("/proc/self/fd").size();
  size_t most = 0;
  const Strings found = Directories(0, kTop, [&](const std::string&) {
    most = std::max(most, ListDirectory("/proc/self/fd").size());
  });
  EXPECT_THAT(found, SizeIs(3 * kDepth));
  EXPECT_LE(most - before, 60U);
  EXPECT_EQ(ListDirectory("/proc/self/fd").size(), before);
}

TEST_F(Chain, LinksOnTheWayDoNotMatter) {
  // Followed on the way down and left on the way up.
  MakeDirectories("/tmp/far");
  Move(Path(100), "/tmp/far/100");
  ASSERT_EQ(symlink("/tmp/far/100", Path(100).c_str()), 0);
  Move(Path(20), "/tmp/far/20");
  ASSERT_EQ(symlink("/tmp/far/20", Path(20).c_str()), 0);
  EXPECT_THAT(Directories(), SizeIs(3 * kDepth));
}

TEST_F(Chain, ALackOfDescriptorsDoesNotMatter) {
  rlimit before = {};
  ASSERT_EQ(getrlimit(RLIMIT_NOFILE, &before), 0);
  const rlimit few = {ListDirectory("/proc/self/fd").size() + 4, before.rlim_max};
  ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &few), 0);
  const Strings found = Directories();
  ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &before), 0);
  EXPECT_THAT(found, SizeIs(3 * kDepth));
}

TEST_F(Chain, ADirectoryThatIsRenamedDoesNotEndTheWalk) {
  for (const int depth : {1, 50, 120, kDepth}) {
    const auto rename = [&] { Move(Path(depth), Path(depth - 1) + "/renamed"); };
    EXPECT_THAT(WalkWith(rename), SizeIs(3 * kDepth)) << depth;
    Move(Path(depth - 1) + "/renamed", Path(depth));
  }
}

TEST_F(Chain, ADirectoryThatIsMovedAwayDoesNotEndTheWalk) {
  for (const int depth : {1, 50, 120, kDepth}) {
    EXPECT_THAT(WalkWith([&] { Move(Path(depth), "/tmp/moved"); }), SizeIs(3 * kDepth)) << depth;
    Move("/tmp/moved", Path(depth));
  }
}

TEST_F(Chain, OnlyWhatIsMovedAwayTwiceIsLost) {
  const auto move = [] {
    Move(Path(60), "/tmp/lower");
    Move(Path(30), "/tmp/upper");
  };
  const Strings found = WalkWith(move, -1);
  EXPECT_EQ(errno, ESTALE);
  const std::set<std::string> all(found.begin(), found.end());
  for (int depth = 0; depth < kDepth; ++depth) {
    const std::string above = Path(depth).substr(std::string(kTop).size());
    const bool isComplete = all.count((above + "/1").substr(1)) == 1 &&  //
                            all.count((above + "/2").substr(1)) == 1;
    EXPECT_TRUE(isComplete || (depth >= 30 && depth < 60)) << depth;
  }
}

TEST_F(TreeWalk, ADirectoryThatIsRemovedDoesNotEndTheWalk) {
  for (const char* name : {"1/1", "1/2", "2/1", "2/2"}) {
    MakeDirectories(In(name));
  }
  // Each directory of the first level removes the other one, or itself with all below.
  bool isFirst = true;
  const auto removeOther = [&](const std::string& path) {
    if (path != kTop && isFirst) {
      isFirst = false;
      RemoveTree(path == In("1") ? In("2") : In("1"));
    }
  };
  EXPECT_THAT(Directories(0, kTop, removeOther), SizeIs(3));
  MakeDirectories(In("1/1"));
  MakeDirectories(In("2/1"));
  const auto removeOwn = [](const std::string& path) {
    if (path != kTop) {
      RemoveTree(path);
    }
  };
  EXPECT_THAT(Directories(0, kTop, removeOwn), UnorderedElementsAre("1", "2"));
}

// The actions.

class Actions : public TreeWalk {
 protected:
  void SetUp() override {
    TreeWalk::SetUp();
    for (const char* name : {"a/1", "a/2", "b/1", "b/2"}) {
      MakeDirectories(In(name));
    }
  }

  /// Walks with a step that returns `action` for the first directory of this name. Returns the
  /// levels of the reports.
  static std::vector<int> Levels(const std::string& name, int action, int expectedResult = 0) {
    std::vector<int> levels;
    bool isReturned = false;
    const auto step = [&](const char* path, const struct stat*, int, struct FTW* place) -> int {
      levels.push_back(place->level);
      const bool isMatch = !isReturned && (path + place->base) == name;
      isReturned = isReturned || isMatch;
      return isMatch ? action : FTW_CONTINUE;
    };
    EXPECT_EQ(WalkTree(kTop, step), expectedResult);
    EXPECT_TRUE(isReturned);
    return levels;
  }
};

TEST_F(Actions, SkipWhatIsBelow) {
  EXPECT_THAT(Levels("tree", FTW_SKIP_SUBTREE), ElementsAre(0));
  EXPECT_EQ(Levels("a", FTW_SKIP_SUBTREE).size(), 5U);
  EXPECT_THAT(Levels("1", FTW_SKIP_SUBTREE), ElementsAre(0, 1, 2, 2, 1, 2, 2));
}

TEST_F(Actions, SkipTheRestOfADirectory) {
  EXPECT_THAT(Levels("tree", FTW_SKIP_SIBLINGS), ElementsAre(0));
  std::string first;
  Directories(0, kTop, [&](const std::string& path) {
    first = first.empty() && path != kTop ? path.substr(path.rfind('/') + 1) : first;
  });
  EXPECT_THAT(Levels(first, FTW_SKIP_SIBLINGS), ElementsAre(0, 1));
}

TEST_F(Actions, EndTheWalk) {
  EXPECT_THAT(Levels("tree", FTW_STOP, FTW_STOP), ElementsAre(0));
  EXPECT_THAT(Levels("tree", -5, -5), ElementsAre(0));
  EXPECT_THAT(Levels("1", 77, 77).back(), 2);
}

}  // namespace
}  // namespace vela_test
