// The thumbnail status of a tree without the entries of the photo queue.
#include <ftw.h>
#include <sys/stat.h>
#include <unistd.h>

#include "storage/deep_files.h"
#include "storage/photo_tree.h"
#include "support/mounts.h"
#include "support/named_case.h"
#include "support/privileges.h"

namespace vela_test {
namespace {

constexpr const char* kQueue = "/var/spool/thumb_create.queue";
constexpr const char* kQueueInProgress = "/var/spool/thumb_create.queue.tmp";
constexpr PhotoWork kNothing = {0, 0};

/// The result of a scan.
struct Scan {
  int result = -77;
  PhotoWork work;
};
bool operator==(const Scan& a, const Scan& b) {
  return a.result == b.result && a.work == b.work;
}
void PrintTo(const Scan& scan, std::ostream* out) {
  PrintTo(scan.work, out);
  *out << ", result " << scan.result;
}

/// A complete scan that found this many photos without any thumbnail.
Scan Bare(int photos) {
  return {0, {photos, 6 * photos}};
}

class TreeStatus : public TreeTest {
 protected:
  static Scan ScanTree(const std::string& dir = kTop) {
    Scan scan;
    scan.result = GetDirThumbStatusRecursive(dir.c_str(), &scan.work.photos, &scan.work.thumbs);
    return scan;
  }
};

TEST_F(TreeStatus, CountsAllDirectories) {
  for (const char* name : {"a.jpg", "b.jpg", "x/a.jpg", "x/y/a.jpg", "x/y/z/a.jpg", "w/a.jpg"}) {
    MakePhoto(In(name));
  }
  MakeThumbs(kTop, "a.jpg", 63);
  MakeThumbs(In("x/y"), "a.jpg", kBitS | kBitM);
  EXPECT_EQ(ScanTree(), (Scan{0, {5, 28}}));
}

TEST_F(TreeStatus, DirectoriesThatAreNotIndexedAreNotEntered) {
  for (const char* name : {".hidden", "@eaDir", "@tmp", "#recycle", "lost+found"}) {
    MakePhoto(In(name) + "/a.jpg");
    MakePhoto(In(name) + "/below/a.jpg");
    MakePhoto(In("x/") + name + "/below/a.jpg");
  }
  EXPECT_EQ(ScanTree(), Bare(0));
  for (const char* name : {"a.hidden", "eaDir", "a@", "a#", "lost+found2"}) {
    MakePhoto(In(name) + "/a.jpg");
  }
  EXPECT_EQ(ScanTree(), Bare(5));
}

TEST_F(TreeStatus, ATopThatIsNotIndexedIsNotEntered) {
  for (const char* name : {"/tmp/@photos", "/tmp/.photos", "/tmp/#photos", "/tmp/lost+found"}) {
    MakePhoto(std::string(name) + "/a.jpg");
    MakePhoto(std::string(name) + "/below/a.jpg");
    EXPECT_EQ(ScanTree(name), Bare(0)) << name;
  }
}

TEST_F(TreeStatus, OnlyTheOwnNameOfTheTopCounts) {
  MakePhoto("/tmp/@photos/.old/top/a.jpg");
  EXPECT_EQ(ScanTree("/tmp/@photos/.old/top"), Bare(1));
}

TEST_F(TreeStatus, ATopMayBeRelative) {
  MakePhoto(In("x/a.jpg"));
  ASSERT_EQ(chdir("/tmp"), 0);
  EXPECT_EQ(ScanTree("tree"), Bare(1));
  EXPECT_EQ(ScanTree("tree/x"), Bare(1));
}

TEST_F(TreeStatus, TrailingSlashesOfTheTopDoNotMatter) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("x/a.jpg"));
  EXPECT_EQ(ScanTree(In("")), Bare(2));
  EXPECT_EQ(ScanTree(In("//")), Bare(2));
  WriteFile(kQueue, "/tmp/tree\n");
  EXPECT_EQ(ScanTree(In("")), Bare(1));
}

TEST_F(TreeStatus, TopsWithoutPhotos) {
  EXPECT_EQ(ScanTree(), Bare(0)) << "an empty directory";
  MakePhoto("/tmp/a.jpg");
  EXPECT_EQ(ScanTree("/tmp/a.jpg"), Bare(0)) << "a file";
  EXPECT_EQ(ScanTree("/tmp/nowhere"), (Scan{-1, kNothing}));
  EXPECT_EQ(ScanTree(""), (Scan{-1, kNothing}));
}

TEST_F(TreeStatus, EveryScanStartsFromZero) {
  MakePhoto(In("a.jpg"));
  g_incomplete_photo_num = 100;
  g_incomplete_thumb_num = -100;
  EXPECT_EQ(ScanTree(), Bare(1));
  EXPECT_EQ(ScanTree(), Bare(1));
  EXPECT_EQ(g_incomplete_photo_num, 1);
  EXPECT_EQ(g_incomplete_thumb_num, 6);
  EXPECT_EQ(ScanTree("/tmp/nowhere"), (Scan{-1, kNothing}));
  EXPECT_EQ(g_incomplete_photo_num, 0);
  EXPECT_EQ(g_incomplete_thumb_num, 0);
}

TEST_F(TreeStatus, ChangesNothing) {
  for (const char* name : {"bare.jpg", "outdated.jpg", "x/bare.jpg"}) {
    MakePhoto(In(name));
  }
  MakeThumbs(kTop, "outdated.jpg", 63, -1);
  WriteFile(In("@eaDir/bare.jpg/VELAPHOTO_THUMB_M.jpg"), "");
  WriteFile(kQueue, "/tmp/tree/x\n");
  const std::vector<std::string> before = ListTree("/tmp");
  EXPECT_EQ(ScanTree(), Bare(2));
  EXPECT_EQ(ListTree("/tmp"), before);
  EXPECT_EQ(ReadFile(kQueue), "/tmp/tree/x\n");
}

class QueuedTree : public TreeStatus {
 protected:
  void SetUp() override {
    TreeStatus::SetUp();
    for (const char* name : {"top.jpg", "a/1.jpg", "a/2.jpg", "a/b/1.jpg", "c/1.jpg"}) {
      MakePhoto(In(name));
    }
  }
};

struct QueueCase : NamedCase {
  std::string content;
  int photos;  ///< those in the tree that are counted
};

class QueuedTreeLines : public QueuedTree, public ::testing::WithParamInterface<QueueCase> {};

TEST_P(QueuedTreeLines, AreLeftOut) {
  for (const char* file : {kQueue, kQueueInProgress}) {
    WriteFile(file, GetParam().content);
    EXPECT_EQ(ScanTree(), Bare(GetParam().photos)) << file;
    RemoveTree(file);
  }
}

const QueueCase kCases[] = {
    {"OneDirectoryButNotThoseBelow", "/tmp/tree/a\n", 3},
    {"TheTopButNotThoseBelow", "/tmp/tree\n", 4},
    {"EveryDirectory", "/tmp/tree/c\n/other\n/tmp/tree/a/b\n/tmp/tree/a\n/tmp/tree\n", 0},
    {"LastLineWithoutNewline", "/other\n/tmp/tree/a", 3},
    {"OtherPaths",
     "/tmp/tree/ab\n/tmp/tree/a/\n/tmp/tree/a/c\n /tmp/tree/a\n/tmp/tree/a \n/tmp/tree/\n/tmp/tre\n"
     "R:/tmp/tree/a\n/tmp/tree/a/1.jpg\n/TMP/TREE/A\n",
     5},
    {"LineAfterOneThatIsTooLong", "/tmp/tree/a" + std::string(5000, 'x') + "\n/tmp/tree/c\n", 4},
};
INSTANTIATE_TEST_SUITE_P(Queue, QueuedTreeLines, ::testing::ValuesIn(kCases), CaseName());

TEST_F(QueuedTree, AnUnreadableQueueCountsAsEmpty) {
  for (const char* file : {kQueue, kQueueInProgress}) {
    SCOPED_TRACE(file);
    WriteFile(file, "/tmp/tree/a\n");
    ASSERT_EQ(chmod(file, 0), 0);
    EXPECT_EQ(ScanTree(), Bare(3)) << "user 0 ignores permission bits";
    const WithoutCapabilities ordinary;
    EXPECT_EQ(ScanTree(), Bare(5));
    RemoveTree(file);
  }
}

TEST_F(QueuedTree, TheVideoQueueDoesNotMatter) {
  WriteFile("/var/spool/flv_create.queue", "/tmp/tree/a\n");
  WriteFile("/var/spool/flv_create.queue.tmp", "/tmp/tree/c\n");
  EXPECT_EQ(ScanTree(), Bare(5));
}

TEST_F(QueuedTree, BothFilesOfTheQueueCount) {
  WriteFile(kQueueInProgress, "/tmp/tree/a\n");
  WriteFile(kQueue, "/tmp/tree/a/b\n");
  EXPECT_EQ(ScanTree(), Bare(2));
}

class TreeStep : public TreeStatus {
 protected:
  void SetUp() override {
    TreeStatus::SetUp();
    MakePhoto(In("a.jpg"));
    g_incomplete_photo_num = 10;
    g_incomplete_thumb_num = 100;
  }

  static int Step(const std::string& path, int typeFlag) {
    struct stat status = {};
    struct FTW walk = {};
    return GetDirThumbStatusRecursive_Callback(path.c_str(), &status, typeFlag, &walk);
  }

  static PhotoWork Counters() { return {g_incomplete_photo_num, g_incomplete_thumb_num}; }
};

TEST_F(TreeStep, AddsADirectoryToTheCounters) {
  EXPECT_EQ(Step(kTop, FTW_D), FTW_CONTINUE);
  EXPECT_EQ(Counters(), (PhotoWork{11, 106}));
  EXPECT_EQ(Step(kTop, FTW_D), FTW_CONTINUE);
  EXPECT_EQ(Counters(), (PhotoWork{12, 112}));
}

TEST_F(TreeStep, ContinuesBelowAQueuedDirectoryWithoutCountingIt) {
  WriteFile(kQueue, "/tmp/tree\n");
  EXPECT_EQ(Step(kTop, FTW_D), FTW_CONTINUE);
  EXPECT_EQ(Counters(), (PhotoWork{10, 100}));
}

TEST_F(TreeStep, SkipsEverythingButDirectories) {
  for (const int typeFlag : {FTW_F, FTW_DNR, FTW_NS, FTW_SL, FTW_SLN, FTW_DP}) {
    EXPECT_EQ(Step(kTop, typeFlag), FTW_SKIP_SUBTREE) << typeFlag;
  }
  EXPECT_EQ(Counters(), (PhotoWork{10, 100}));
}

TEST_F(TreeStep, SkipsDirectoriesThatAreNotIndexed) {
  for (const char* name : {"@eaDir", ".hidden", "#recycle", "lost+found"}) {
    MakePhoto(In(name) + "/a.jpg");
    EXPECT_EQ(Step(In(name), FTW_D), FTW_SKIP_SUBTREE) << name;
  }
  EXPECT_EQ(Counters(), (PhotoWork{10, 100}));
}

TEST_F(TreeStep, UsesTheNameAfterTheLastSlash) {
  MakePhoto("/tmp/@a/b/a.jpg");
  EXPECT_EQ(Step("/tmp/@a/b", FTW_D), FTW_CONTINUE);
  EXPECT_EQ(Counters(), (PhotoWork{11, 106}));
  ASSERT_EQ(chdir("/tmp"), 0);
  EXPECT_EQ(Step("@a", FTW_D), FTW_SKIP_SUBTREE);
  EXPECT_EQ(Step("tree", FTW_D), FTW_CONTINUE);
  EXPECT_EQ(Counters(), (PhotoWork{12, 112}));
}

TEST_F(TreeStatus, OtherFileSystemsAreNotEntered) {
  MakePhoto(In("a.jpg"));
  const SmallVolume volume(In("volume"), 1 << 20);
  MakePhoto(In("volume/a.jpg"));
  MakePhoto(In("volume/below/a.jpg"));
  EXPECT_EQ(ScanTree(), Bare(1));
  EXPECT_EQ(ScanTree(In("volume")), Bare(2));
}

TEST_F(TreeStatus, UnreadableDirectoriesDoNotStopTheScan) {
  for (const char* name : {"a/1.jpg", "closed/1.jpg", "listed/1.jpg", "z/1.jpg"}) {
    MakePhoto(In(name));
  }
  ASSERT_EQ(chmod(In("closed").c_str(), 0), 0);
  ASSERT_EQ(chmod(In("listed").c_str(), 0444), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(ScanTree(), Bare(2));
}

TEST_F(TreeStatus, LinksToDirectoriesAreFollowed) {
  MakePhoto("/tmp/elsewhere/a.jpg");
  MakePhoto("/tmp/elsewhere/below/a.jpg");
  ASSERT_EQ(symlink("/tmp/elsewhere", In("link").c_str()), 0);
  ASSERT_EQ(symlink("/tmp/nowhere", In("dangling").c_str()), 0);
  EXPECT_EQ(ScanTree(), Bare(2));
}

TEST_F(TreeStatus, ADirectoryWithSeveralNamesIsCountedOnce) {
  MakePhoto(In("a/1.jpg"));
  ASSERT_EQ(symlink("a", In("b").c_str()), 0);
  ASSERT_EQ(symlink("../tree/a", In("c").c_str()), 0);
  EXPECT_EQ(ScanTree(), Bare(1));
}

TEST_F(TreeStatus, ALoopOfLinksEnds) {
  MakePhoto(In("a/1.jpg"));
  MakePhoto(In("a/b/1.jpg"));
  ASSERT_EQ(symlink("/tmp/tree", In("a/b/top").c_str()), 0);
  ASSERT_EQ(symlink(".", In("a/here").c_str()), 0);
  EXPECT_EQ(ScanTree(), Bare(2));
}

TEST_F(TreeStatus, ALinkToItselfHidesNothing) {
  MakePhoto(In("before/a.jpg"));
  ASSERT_EQ(symlink("itself", In("itself").c_str()), 0);
  MakePhoto(In("after/a.jpg"));
  EXPECT_EQ(ScanTree(), Bare(2));
}

TEST_F(TreeStatus, ADeepTreeIsCountedToItsEnd) {
  const DeepTree tree(kTop, "d", 500, "a.jpg");
  EXPECT_EQ(ScanTree(), Bare(500));
}

TEST_F(TreeStatus, DirectoryNamesOfTheLongestKindCount) {
  const std::string longest(255, 'n');
  MakePhoto(In(longest) + "/a.jpg");
  MakePhoto(In(longest) + "/" + longest + "/a.jpg");
  EXPECT_EQ(ScanTree(), Bare(2));
  WriteFile(kQueue, In(longest) + "\n");
  EXPECT_EQ(ScanTree(), Bare(1));
}

TEST_F(TreeStatus, DirectoriesBeyondTheLongestPathLackNothing) {
  // The directories' paths have 11 + 201 * level bytes, their photos' 6 more: those of level 20
  // (4037) are the last to be reached.
  const DeepTree tree(kTop, std::string(200, 'd'), 23, "a.jpg");
  EXPECT_EQ(ScanTree(), Bare(20));
}

TEST_F(TreeStatus, ADirectoryWithALongPathIsFoundInTheQueue) {
  const std::string photo = PathOfLength(4088, "a.jpg");
  MakePhoto(photo);
  const std::string top = photo.substr(0, photo.find('/', 5));
  EXPECT_EQ(ScanTree(top), Bare(1));
  const std::string dir = DirectoryOf(photo);
  WriteFile(kQueue, dir + "x\n" + dir + "\n");
  EXPECT_EQ(ScanTree(top), Bare(0));
}

}  // namespace
}  // namespace vela_test
