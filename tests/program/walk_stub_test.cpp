// The walk over a tree of directories.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/program.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

class Walk : public StubProgramTest {
 protected:
  /// Puts a photo into the directory, which is made.
  static void Put(const std::string& dir) { MakePhoto(dir + "/a.jpg"); }

  /// Walks the tree; returns the directories whose photo was reported, in order.
  static std::vector<std::string> WalkTree(const std::string& tree = kPhotos,
                                           const ProgramOptions& options = ProgramOptions()) {
    const DaemonPeer daemon;
    EXPECT_GOOD_END(Run({"R:" + tree}, options));
    std::vector<std::string> directories = ReportedPhotos(daemon);
    for (std::string& directory : directories) {
      directory.resize(directory.rfind('/'));
    }
    EXPECT_THAT(ErrorLines(), IsEmpty());
    return directories;
  }
};

TEST_F(Walk, TakesTheStartDirectoryAndAllBelow) {
  for (const char* dir : {"/tmp/photos", "/tmp/photos/1", "/tmp/photos/1/2", "/tmp/photos/3"}) {
    Put(dir);
  }
  EXPECT_THAT(WalkTree(), UnorderedElementsAre("/tmp/photos", "/tmp/photos/1", "/tmp/photos/1/2",
                                               "/tmp/photos/3"));
}

TEST_F(Walk, TakesADirectoryBeforeItsSubdirectories) {
  for (const char* dir : {"/tmp/photos/z/y/x", "/tmp/photos/z/y", "/tmp/photos/z", "/tmp/photos"}) {
    Put(dir);
  }
  EXPECT_THAT(WalkTree(),
              ElementsAre("/tmp/photos", "/tmp/photos/z", "/tmp/photos/z/y", "/tmp/photos/z/y/x"));
}

TEST_F(Walk, EachDirectoryGetsItsOwnPass) {
  Put("/tmp/photos");
  Put("/tmp/photos/sub");
  WalkTree();
  EXPECT_THAT(ReadLines(kQueue), ElementsAre("/tmp/photos", "/tmp/photos/sub"));
  EXPECT_THAT(
      MetadataOf("/tmp/photos/sub/a.jpg"),
      ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_XL.jpg"));
}

TEST_F(Walk, GoesThroughDirectoriesWithoutPhotos) {
  Put("/tmp/photos/1/2/3");
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos/1/2/3"));
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir"));
  EXPECT_FALSE(Exists("/tmp/photos/1/@eaDir"));
}

TEST_F(Walk, LeavesOutRefusedNamesWithAllBelow) {
  for (const char* name : {".hidden", "@tmp", "@eaDir", "#recycle", "lost+found"}) {
    Put(std::string("/tmp/photos/") + name);
    Put(std::string("/tmp/photos/") + name + "/below");
  }
  Put("/tmp/photos/taken");
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos/taken"));
}

TEST_F(Walk, LeavesOutTheMetadataItMakes) {
  Put("/tmp/photos");
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos"));
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir/@eaDir"));
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir/a.jpg/@eaDir"));
}

TEST_F(Walk, RefusedStartDirectoryLeavesNothing) {
  for (const char* dir : {"/tmp/.hidden", "/tmp/@tmp"}) {
    Put(dir);
    Put(std::string(dir) + "/below");
    EXPECT_THAT(WalkTree(dir), IsEmpty());
  }
}

TEST_F(Walk, NamesAboveTheStartDirectoryDoNotCount) {
  Put("/tmp/@above/photos");
  EXPECT_THAT(WalkTree("/tmp/@above/photos"), ElementsAre("/tmp/@above/photos"));
}

TEST_F(Walk, StartDirectoryMayEndInSlashes) {
  Put("/tmp/photos");
  Put("/tmp/photos/sub");
  EXPECT_THAT(WalkTree("/tmp/photos///"), ElementsAre("/tmp/photos", "/tmp/photos/sub"));
}

TEST_F(Walk, DotIsARefusedName) {
  Put("/tmp/photos");
  ProgramOptions options;
  options.workingDirectory = kPhotos;
  EXPECT_THAT(WalkTree(".", options), IsEmpty());
}

TEST_F(Walk, DoesNotEnterOtherVolumes) {
  const SmallVolume volume("/tmp/photos/volume", 16 << 20);
  Put("/tmp/photos/volume");
  Put("/tmp/photos/volume/below");
  Put("/tmp/photos/sub");
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos/sub"));
  EXPECT_FALSE(Exists("/tmp/photos/volume/@eaDir"));
}

TEST_F(Walk, StartDirectoryMayBeAVolume) {
  const SmallVolume volume(kPhotos, uint64_t{2} << 30);
  Put("/tmp/photos");
  Put("/tmp/photos/sub");
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos", "/tmp/photos/sub"));
}

TEST_F(Walk, FollowsLinksToDirectories) {
  Put("/tmp/elsewhere");
  Put("/tmp/elsewhere/below");
  ASSERT_EQ(0, symlink("/tmp/elsewhere", "/tmp/photos/link"));
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos/link", "/tmp/photos/link/below"));
  EXPECT_TRUE(Exists("/tmp/elsewhere/@eaDir"));
}

TEST_F(Walk, StartDirectoryMayBeALink) {
  Put("/tmp/elsewhere/sub");
  ASSERT_EQ(0, symlink("/tmp/elsewhere", "/tmp/link"));
  EXPECT_THAT(WalkTree("/tmp/link"), ElementsAre("/tmp/link/sub"));
}

TEST_F(Walk, ALinksOwnNameCounts) {
  Put("/tmp/elsewhere");
  Put("/tmp/@refused");
  ASSERT_EQ(0, symlink("/tmp/elsewhere", "/tmp/photos/@link"));
  ASSERT_EQ(0, symlink("/tmp/@refused", "/tmp/photos/link"));
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos/link"));
}

TEST_F(Walk, LoopsEnd) {
  Put("/tmp/photos");
  Put("/tmp/photos/1");
  ASSERT_EQ(0, symlink("..", "/tmp/photos/1/up"));
  ASSERT_EQ(0, symlink("/tmp/photos/1", "/tmp/photos/1/self"));
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos", "/tmp/photos/1"));
}

TEST_F(Walk, FailureInTheMiddleIsIgnored) {
  // A link that leads to itself is more than the C library's walk can pass over.
  Put("/tmp/photos");
  Put("/tmp/other");
  ASSERT_EQ(0, symlink("round", "/tmp/photos/round"));
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run({"R:/tmp/photos", "R:/tmp/other"}));
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre("/tmp/photos/a.jpg", "/tmp/other/a.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Walk, PassesOverDirectoriesThatCannotBeRead) {
  Put("/tmp/photos/closed");
  Put("/tmp/photos/open");
  ASSERT_EQ(0, chmod("/tmp/photos/closed", 0333));
  ProgramOptions options;
  options.beforeExec = {DropCapabilities()};
  EXPECT_THAT(WalkTree(kPhotos, options), ElementsAre("/tmp/photos/open"));
}

TEST_F(Walk, GoesOnBelowDirectoriesThatMayHaveNoMetadata) {
  Put("/tmp/photos");
  Put("/tmp/photos/sub");
  ASSERT_EQ(0, chmod("/tmp/photos", 0555));
  ProgramOptions options;
  options.beforeExec = {DropCapabilities()};
  EXPECT_THAT(WalkTree(kPhotos, options), ElementsAre("/tmp/photos/sub"));
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir"));
}

TEST_F(Walk, GoesDeeperThanItHasDescriptors) {
  std::string dir = kPhotos;
  for (int depth = 0; depth < 130; ++depth) {
    dir += "/d";
    MakeDirectories(dir);
  }
  Put(dir);
  EXPECT_THAT(WalkTree(), ElementsAre(dir));
}

}  // namespace
}  // namespace vela_test
