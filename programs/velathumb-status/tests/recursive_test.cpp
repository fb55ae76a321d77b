// Whole trees.
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <sstream>
#include <utility>

#include "status_fixture.h"
#include "status_scan.h"
#include "storage/deep_files.h"
#include "support/mounts.h"
#include "support/seccomp_fail.h"

namespace vela_test {
namespace {

using namespace ::testing;

class TreeStatusTest : public StatusTest {
 protected:
  static StatusText Query(std::vector<std::string> arguments = {kTop}) {
    arguments.insert(arguments.begin(), "--recursive");
    const ProgramResult result = RunStatus(arguments);
    EXPECT_EQ(result.err, "");
    return ReadStatusText(result.out);
  }

  /// The counts of the library for the tree.
  static PhotoWork LibraryWork(const std::string& dir = kTop) {
    PhotoWork work;
    EXPECT_EQ(GetDirThumbStatusRecursive(dir.c_str(), &work.photos, &work.thumbs), 0);
    return work;
  }
};

TEST_F(TreeStatusTest, HasALineForEachDirectory) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("one/a.jpg"));
  MakePhoto(In("one/deep/a.jpg"));
  MakePhoto(In("one/deep/b.jpg"));
  MakeDirectories(In("empty"));
  const StatusText answer = Query();
  EXPECT_THAT(answer.Names(), ElementsAre(kTop, In("empty"), In("one"), In("one/deep")));
  EXPECT_EQ(answer.totals.numbers, (StatusNumbers{4, 4, 0, 24, 0}));
  EXPECT_EQ(answer.totals.name, "in 4 directories");
}

TEST_F(TreeStatusTest, DirectoriesAreSortedByTheBytesOfTheirPaths) {
  const std::vector<std::string> names = {"A",   "B b", "a", "a-1",      "a-1/x",
                                          "a/b", "a0",  "z", "\xc3\xa4", "\xff"};
  // The order in which they are created is that of many file systems.
  for (size_t i = 0; i < names.size(); ++i) {
    MakePhoto(In(names[(i * 7 + 3) % names.size()] + "/p.jpg"));
  }
  std::vector<std::string> sorted = {kTop};
  for (const std::string& name : names) {
    sorted.push_back(In(name));
  }
  EXPECT_EQ(Query().Names(), sorted);
  std::vector<std::string> json;
  const Json::Value answer = QueryJson({"-r", kTop});
  for (const Json::Value& directory : answer["directories"]) {
    json.push_back(directory.isMember("path_base64") ? In("\xff") : directory["path"].asString());
  }
  EXPECT_EQ(json, sorted);
  RunStatus({"-r", "--html", "/tmp/page.html", kTop});
  const std::string page = ReadFile("/tmp/page.html");
  size_t place = 0;
  for (const std::string& path : sorted) {
    const std::string shown = path == In("\xff") ? In("\xef\xbf\xbd") : path;
    place = page.find("\">" + shown + "</bdi>", place);
    ASSERT_NE(place, std::string::npos) << path;
  }
}

TEST_F(TreeStatusTest, ListsADirectoryBeforeWhatIsBelowIt) {
  MakeDirectories(In("one/deep"));
  EXPECT_THAT(Query().Names(), ElementsAre(kTop, In("one"), In("one/deep")));
}

TEST_F(TreeStatusTest, SkipsNamesThatAreNotIndexed) {
  for (const char* name : {".hidden", "@eaDir", "@tmp", "#recycle", "lost+found", "good/@eaDir"}) {
    MakePhoto(In(name) + "/a.jpg");
  }
  const StatusText answer = Query();
  EXPECT_THAT(answer.Names(), UnorderedElementsAre(kTop, In("good")));
  EXPECT_EQ(answer.totals.numbers.photos, 0);
}

TEST_F(TreeStatusTest, SkipsOtherFileSystems) {
  const SmallVolume volume(In("other"), 1 << 20);
  MakePhoto(In("other/a.jpg"));
  MakePhoto(In("same/a.jpg"));
  EXPECT_THAT(Query().Names(), UnorderedElementsAre(kTop, In("same")));
  EXPECT_THAT(Query({In("other")}).Names(), ElementsAre(In("other")));
}

TEST_F(TreeStatusTest, CountsALoopOfLinksOnce) {
  MakePhoto(In("one/a.jpg"));
  ASSERT_EQ(symlink(kTop, In("one/up").c_str()), 0);
  ASSERT_EQ(symlink(".", In("self").c_str()), 0);
  const StatusText answer = Query();
  EXPECT_THAT(answer.Names(), UnorderedElementsAre(kTop, In("one")));
  EXPECT_EQ(answer.totals.numbers.photos, 1);
  EXPECT_EQ(LibraryWork(), (PhotoWork{1, 6}));
}

TEST_F(TreeStatusTest, CountsNestedAndRepeatedRootsOnce) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("one/a.jpg"));
  MakePhoto(In("one/deep/a.jpg"));
  const StatusText down = Query({kTop, In("one"), kTop});
  EXPECT_THAT(down.Names(), UnorderedElementsAre(kTop, In("one"), In("one/deep")));
  EXPECT_EQ(down.totals.numbers.photos, 3);
  const StatusText up = Query({In("one/deep"), kTop});
  EXPECT_THAT(up.Names(), UnorderedElementsAre(kTop, In("one"), In("one/deep")));
  EXPECT_EQ(up.totals.numbers.photos, 3);
}

TEST_F(TreeStatusTest, AgreesWithTheLibraryWithoutQueuedDirectories) {
  for (const char* name : {"a.jpg", "one/a.jpg", "one/b.jpg", "one/deep/a.jpg", "two/a.jpg"}) {
    MakePhoto(In(name));
  }
  MakeThumbs(In("two"), "a.jpg", kBitS | kBitM);
  WriteFile(kPhotoQueue, In("one") + "\n" + In("none") + "\nR:" + In("two") + "\n");
  const StatusText answer = Query();
  EXPECT_EQ(answer.totals.numbers, (StatusNumbers{5, 5, 2, 28, 0}));
  EXPECT_EQ(answer.totals.queued, "1");
  PhotoWork free = {0, 0};
  for (const StatusLine& line : answer.directories) {
    EXPECT_EQ(line.queued, line.name == In("one") ? "yes" : "no") << line.name;
    if (line.queued == "no") {
      free.photos += static_cast<int>(line.numbers.toDo);
      free.thumbs += static_cast<int>(line.numbers.missing);
    }
  }
  EXPECT_EQ(LibraryWork(), free);
  EXPECT_EQ(free, (PhotoWork{3, 16}));
}

TEST_F(TreeStatusTest, JsonTotalsWithoutQueuedDirectoriesAgreeWithTheLibrary) {
  for (const char* name : {"a.jpg", "one/a.jpg", "one/b.jpg", "one/deep/a.jpg"}) {
    MakePhoto(In(name));
  }
  WriteFile(kPhotosInProgress, In("one") + "\n");
  const Json::Value totals = QueryJson({"-r", kTop})["totals"];
  const PhotoWork work = LibraryWork();
  EXPECT_EQ(work, (PhotoWork{2, 12}));
  EXPECT_EQ(totals["incomplete_photos"].asInt() - totals["queued"]["incomplete_photos"].asInt(),
            work.photos);
  EXPECT_EQ(totals["missing_thumbs"].asInt() - totals["queued"]["missing_thumbs"].asInt(),
            work.thumbs);
}

TEST_F(TreeStatusTest, AnUnreadableDirectoryIsAnErrorAndTheRestIsReported) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("closed/a.jpg"));
  MakePhoto(In("open/a.jpg"));
  ASSERT_EQ(chmod(In("closed").c_str(), 0), 0);
  const ProgramResult result = RunStatusAsOrdinaryUser({"-r", kTop});
  ExpectError(result, "/tmp/photos/closed: cannot be opened");
  EXPECT_EQ(ReadStatusText(result.out).totals.numbers, (StatusNumbers{2, 2, 0, 12, 0}));
}

TEST_F(TreeStatusTest, AnUnreadableRootIsAnError) {
  ASSERT_EQ(chmod(kTop, 0), 0);
  ExpectError(RunStatusAsOrdinaryUser({"-r", kTop}), "/tmp/photos: cannot be opened");
}

TEST_F(TreeStatusTest, ATreeWhoseSubdirectoriesCannotBeExaminedIsAnError) {
  MakePhoto(In("below/a.jpg"));
  ASSERT_EQ(chmod(kTop, 0444), 0);
  ExpectError(RunStatusAsOrdinaryUser({"-r", kTop}), "/tmp/photos: Permission denied");
}

TEST_F(TreeStatusTest, ARootThatIsSkippedBecauseOfItsNameIsAnError) {
  MakePhoto("/tmp/@eaDir/a.jpg");
  MakePhoto(In("a.jpg"));
  const ProgramResult result = RunStatus({"-r", "/tmp/@eaDir", kTop});
  ExpectError(result, "/tmp/@eaDir: is skipped in trees because of its name");
  EXPECT_THAT(ReadStatusText(result.out).Names(), ElementsAre(kTop));
}

TEST_F(TreeStatusTest, AMissingRootAndAFileAreErrors) {
  MakePhoto(In("a.jpg"));
  const ProgramResult result = RunStatus({"-r", "/tmp/none", In("a.jpg"), kTop});
  ExpectError(result,
              "/tmp/none: No such file or directory\n"
              "velathumb-status: /tmp/photos/a.jpg: Not a directory");
  EXPECT_THAT(ReadStatusText(result.out).Names(), ElementsAre(kTop));
}

TEST_F(TreeStatusTest, DirectoriesTooDeepForAPathAreErrorsAndTheRestIsReported) {
  MakePhoto("/tmp/other/a.jpg");
  // 11 bytes and 201 for each level: the twentieth is the last that a path can reach.
  const DeepTree tree(kTop, std::string(200, 'd'), 25, "a.jpg");
  const ProgramResult result = RunStatus({"-r", kTop, "/tmp/other"});
  EXPECT_EQ(result.exitCode, 2);
  std::istringstream errors(result.err);
  int count = 0;
  for (std::string line; std::getline(errors, line); ++count) {
    EXPECT_THAT(line, EndsWith("dddd: File name too long"));
  }
  EXPECT_EQ(count, 5);
  const StatusText answer = ReadStatusText(result.out);
  EXPECT_EQ(answer.Names().front(), kTop);
  EXPECT_EQ(answer.Names().back(), "/tmp/other");
  EXPECT_EQ(answer.totals.name, "in 22 directories");
  EXPECT_EQ(answer.totals.numbers.photos, 21);
}

/// Removes a directory as soon as the first one is scanned.
class RemovingSink : public vela::StatusSink {
 public:
  explicit RemovingSink(std::string directory) : directory_(std::move(directory)) {}

  void BeginDirectory() override { RemoveTree(directory_); }
  void EndDirectory(const vela::DirectoryReport& directory) override {
    scanned.push_back(directory.path);
  }

  std::vector<std::string> scanned;

 private:
  const std::string directory_;
};

TEST_F(TreeStatusTest, ADirectoryThatIsRemovedDuringTheScanIsNoError) {
  MakeDirectories(In("gone/below"));
  MakeDirectories(In("kept"));
  RemovingSink sink(In("gone"));
  std::vector<std::string> errors;
  const vela::ScanErrorHandler note = [&](const std::string& path, const std::string& message) {
    errors.push_back(path + ": " + message);
  };
  vela::ScanOptions options;
  options.recursive = true;
  vela::ScanStatus({kTop}, options, sink, note);
  EXPECT_THAT(sink.scanned, ElementsAre(kTop, In("kept")));
  EXPECT_THAT(errors, IsEmpty());
  // The root itself was asked for.
  RemoveTree(kTop);
  vela::ScanStatus({kTop}, options, sink, note);
  EXPECT_THAT(errors, ElementsAre(std::string(kTop) + ": No such file or directory"));
}

TEST_F(TreeStatusTest, AnIncompleteWalkIsAnError) {
  MakeDirectories(In("below"));
  ProgramOptions options;
  options.beforeExec = {SeccompFail({SYS_getdents64}, EIO)};
  const ProgramResult result = RunStatus({"-r", kTop}, options);
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_THAT(result.err, HasSubstr("velathumb-status: /tmp/photos: was not scanned completely: "
                                    "Input/output error\n"));
  EXPECT_EQ(ReadStatusText(result.out).Names().front(), kTop);
}

TEST_F(TreeStatusTest, FewDescriptorsAreEnough) {
  std::string path = kTop;
  for (int level = 0; level < 40; ++level) {
    path += "/d";
  }
  MakeDirectories(path);
  ProgramOptions options;
  options.beforeExec = {LimitResource(RLIMIT_NOFILE, 20)};
  const ProgramResult result = RunStatus({"-r", kTop}, options);
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.err, "");
  EXPECT_EQ(ReadStatusText(result.out).totals.name, "in 41 directories");
}

TEST_F(TreeStatusTest, RelativeRootsAreResolved) {
  MakePhoto(In("below/a.jpg"));
  ProgramOptions options;
  options.workingDirectory = In("below");
  for (const char* name : {".", "..", "../below/", "../../photos/."}) {
    const ProgramResult result = RunStatus({"-r", name}, options);
    EXPECT_EQ(result.err, "") << name;
    EXPECT_EQ(ReadStatusText(result.out).totals.numbers.photos, 1) << name;
  }
  EXPECT_THAT(Query({"/tmp/photos/."}).Names(), ElementsAre(kTop, In("below")));
  EXPECT_THAT(Query({"/tmp//photos//"}).Names(), ElementsAre(kTop, In("below")));
}

TEST_F(TreeStatusTest, ListsPhotosOfEachDirectory) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"16\"\n");
  MakePhoto(In("a.jpg"));
  MakePhoto(In("one/b.jpg"));
  const StatusText answer = Query({"--photos", kTop});
  ASSERT_THAT(answer.Names(), ElementsAre(kTop, In("one")));
  EXPECT_THAT(answer.directories[0].photos, ElementsAre("a.jpg: missing XL"));
  EXPECT_THAT(answer.directories[1].photos, ElementsAre("b.jpg: missing XL"));
}

}  // namespace
}  // namespace vela_test
