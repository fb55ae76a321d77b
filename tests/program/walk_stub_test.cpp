// The walk over a tree of directories.
#include <sys/stat.h>
#include <unistd.h>

#include "program/stub_program_test.h"
#include "support/mounts.h"
#include "support/users.h"

namespace vela_test {
namespace {

using ::testing::UnorderedElementsAre;

class Walk : public StubProgramTest {
 protected:
  /// Walks the tree. Returns the directories whose photo was reported, in order.
  static Strings WalkTree(const std::string& tree = kPhotos,
                          const ProgramOptions& options = ProgramOptions()) {
    Strings directories = ReportedPhotos(RunWithDaemon({"R:" + tree}, options));
    for (std::string& directory : directories) {
      directory.resize(directory.rfind('/'));
    }
    EXPECT_THAT(ErrorLines(), IsEmpty());
    return directories;
  }
};

TEST_F(Walk, TakesTheStartDirectoryAndAllBelow) {
  MakePhotosIn({"/tmp/photos", "/tmp/photos/1", "/tmp/photos/1/2", "/tmp/photos/3"});
  EXPECT_THAT(WalkTree(), UnorderedElementsAre("/tmp/photos", "/tmp/photos/1", "/tmp/photos/1/2",
                                               "/tmp/photos/3"));
}

TEST_F(Walk, EachDirectoryGetsItsOwnPass) {
  MakePhotosIn({"/tmp/photos", "/tmp/photos/sub"});
  WalkTree();
  EXPECT_THAT(ReadLines(kQueue), ElementsAre("/tmp/photos", "/tmp/photos/sub"));
  EXPECT_EQ(MetadataOf("/tmp/photos/sub/a.jpg"), kThumbsOfFirstRun);
}

struct Tree : NamedCase {
  Strings photos;  ///< directories with a photo
  std::string start;
  Strings taken;  ///< directories whose photo is reported, in order
};

class EachTree : public Walk, public ::testing::WithParamInterface<Tree> {};

TEST_P(EachTree, IsWalked) {
  MakePhotosIn(GetParam().photos);
  EXPECT_EQ(WalkTree(GetParam().start), GetParam().taken);
}

const Strings kChain = {"/tmp/photos", "/tmp/photos/z", "/tmp/photos/z/y", "/tmp/photos/z/y/x"};
const Strings kRefused = {"/tmp/photos/.hidden/below",    "/tmp/photos/.hidden",
                          "/tmp/photos/@tmp/below",       "/tmp/photos/@tmp",
                          "/tmp/photos/@eaDir/below",     "/tmp/photos/@eaDir",
                          "/tmp/photos/#recycle/below",   "/tmp/photos/#recycle",
                          "/tmp/photos/lost+found/below", "/tmp/photos/lost+found"};
const Strings kTwo = {"/tmp/photos", "/tmp/photos/sub"};

INSTANTIATE_TEST_SUITE_P(
    Trees, EachTree,
    ::testing::Values(
        Tree{"DirectoryBeforeItsSubdirectories", {kChain.rbegin(), kChain.rend()}, kPhotos, kChain},
        Tree{"HiddenStart", {"/tmp/.hidden", "/tmp/.hidden/below"}, "/tmp/.hidden", {}},
        Tree{"RefusedStart", {"/tmp/@tmp", "/tmp/@tmp/below"}, "/tmp/@tmp", {}},
        Tree{"RefusedNameAboveTheStart", {"/tmp/@a/sub"}, "/tmp/@a/sub", {"/tmp/@a/sub"}},
        Tree{"StartWithSlashesAtItsEnd", kTwo, "/tmp/photos///", kTwo}),
    CaseName());

TEST_F(Walk, SkipsRefusedNamesWithAllBelow) {
  MakePhotosIn({kRefused});
  MakePhotosIn({"/tmp/photos/taken"});
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos/taken"));
}

TEST_F(Walk, GoesThroughDirectoriesWithoutPhotos) {
  MakePhotosIn({"/tmp/photos/1/2/3"});
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos/1/2/3"));
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir"));
  EXPECT_FALSE(Exists("/tmp/photos/1/@eaDir"));
}

TEST_F(Walk, SkipsTheMetadataThatItCreates) {
  MakePhotosIn({"/tmp/photos"});
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos"));
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir/@eaDir"));
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir/a.jpg/@eaDir"));
}

TEST_F(Walk, DotIsARefusedName) {
  MakePhotosIn({"/tmp/photos"});
  EXPECT_THAT(WalkTree(".", InDirectory(kPhotos)), IsEmpty());
}

TEST_F(Walk, DoesNotEnterOtherVolumes) {
  const SmallVolume volume("/tmp/photos/volume", 16 << 20);
  MakePhotosIn({"/tmp/photos/volume", "/tmp/photos/volume/below", "/tmp/photos/sub"});
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos/sub"));
  EXPECT_FALSE(Exists("/tmp/photos/volume/@eaDir"));
}

TEST_F(Walk, StartDirectoryMayBeAVolume) {
  const SmallVolume volume(kPhotos, uint64_t{2} << 30);
  MakePhotosIn({"/tmp/photos", "/tmp/photos/sub"});
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos", "/tmp/photos/sub"));
}

TEST_F(Walk, FollowsLinksToDirectories) {
  MakePhotosIn({"/tmp/elsewhere", "/tmp/elsewhere/below"});
  ASSERT_EQ(symlink("/tmp/elsewhere", "/tmp/photos/link"), 0);
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos/link", "/tmp/photos/link/below"));
  EXPECT_TRUE(Exists("/tmp/elsewhere/@eaDir"));
}

TEST_F(Walk, StartDirectoryMayBeALink) {
  MakePhotosIn({"/tmp/elsewhere/sub"});
  ASSERT_EQ(symlink("/tmp/elsewhere", "/tmp/link"), 0);
  EXPECT_THAT(WalkTree("/tmp/link"), ElementsAre("/tmp/link/sub"));
}

TEST_F(Walk, ALinksOwnNameCounts) {
  MakePhotosIn({"/tmp/elsewhere", "/tmp/@refused"});
  ASSERT_EQ(symlink("/tmp/elsewhere", "/tmp/photos/@link"), 0);
  ASSERT_EQ(symlink("/tmp/@refused", "/tmp/photos/link"), 0);
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos/link"));
}

TEST_F(Walk, LoopsEnd) {
  MakePhotosIn({"/tmp/photos", "/tmp/photos/1"});
  ASSERT_EQ(symlink("..", "/tmp/photos/1/up"), 0);
  ASSERT_EQ(symlink("/tmp/photos/1", "/tmp/photos/1/self"), 0);
  EXPECT_THAT(WalkTree(), ElementsAre("/tmp/photos", "/tmp/photos/1"));
}

TEST_F(Walk, LinksThatLeadNowhereDoNotEndIt) {
  MakePhotosIn({"/tmp/photos/1"});
  ASSERT_EQ(symlink("round", "/tmp/photos/round"), 0);
  ASSERT_EQ(symlink("pong", "/tmp/photos/ping"), 0);
  ASSERT_EQ(symlink("ping", "/tmp/photos/pong"), 0);
  ASSERT_EQ(symlink("1/a.jpg/below", "/tmp/photos/file"), 0);
  ASSERT_EQ(symlink(std::string(300, 'n').c_str(), "/tmp/photos/long"), 0);
  MakePhotosIn({"/tmp/photos/2"});
  EXPECT_THAT(WalkTree(), UnorderedElementsAre("/tmp/photos/1", "/tmp/photos/2"));
}

TEST_F(Walk, AFailureIsIgnored) {
  MakePhotosIn({"/tmp/photos", "/tmp/other"});
  ASSERT_EQ(symlink("round", "/tmp/round"), 0);
  EXPECT_THAT(ReportedPhotos(RunWithDaemon({"R:/tmp/photos", "R:/tmp/round", "R:/tmp/other"})),
              ElementsAre("/tmp/photos/a.jpg", "/tmp/other/a.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Walk, DoesNotFollowLinksOfOtherUsers) {
  if (!HasOtherUsers()) {
    return;  // everything belongs to user 0
  }
  MakePhotosIn({"/tmp/private"});
  ASSERT_EQ(chown("/tmp/private", 2000, 2000), 0);
  ASSERT_EQ(symlink("/tmp/private", "/tmp/photos/link"), 0);
  ASSERT_EQ(lchown("/tmp/photos/link", 1000, 1000), 0);
  EXPECT_THAT(WalkTree(), IsEmpty());
  EXPECT_FALSE(Exists("/tmp/private/@eaDir"));
}

TEST_F(Walk, SkipsDirectoriesThatCannotBeRead) {
  MakePhotosIn({"/tmp/photos/closed", "/tmp/photos/open"});
  ASSERT_EQ(chmod("/tmp/photos/closed", 0333), 0);
  EXPECT_THAT(WalkTree(kPhotos, WithSteps({DropCapabilities()})), ElementsAre("/tmp/photos/open"));
}

TEST_F(Walk, ContinuesBelowDirectoriesThatMayHaveNoMetadata) {
  MakePhotosIn({"/tmp/photos", "/tmp/photos/sub"});
  ASSERT_EQ(chmod("/tmp/photos", 0555), 0);
  EXPECT_THAT(WalkTree(kPhotos, WithSteps({DropCapabilities()})), ElementsAre("/tmp/photos/sub"));
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir"));
}

TEST_F(Walk, GoesDeeperThanItHasDescriptors) {
  std::string dir = kPhotos;
  for (int depth = 0; depth < 130; ++depth) {
    dir += "/d";
    MakeDirectories(dir);
  }
  MakePhotosIn({dir});
  EXPECT_THAT(WalkTree(), ElementsAre(dir));
}

}  // namespace
}  // namespace vela_test
