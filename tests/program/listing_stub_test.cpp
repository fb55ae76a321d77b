// Which photos of a directory are taken, in which order, and what is made for them.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <vector>

#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/seccomp_fail.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

constexpr const char* kRoot = "/tmp/photos/@eaDir";

std::string In(const std::string& name) {
  return std::string(kPhotos) + "/" + name;
}

/// The line of a directory that could not be made.
std::string MkdirLine(const std::string& path, int error) {
  return "velathumb:447 velathumb: checkCreateDir(447) - mkdir(" + path +
         ", 0777 ), errno: " + std::to_string(error) + "\n";
}

class Listing : public StubProgramTest {
 protected:
  /// Runs the program with a daemon; returns the photos reported, in order.
  static std::vector<std::string> RunAndGetReports(
      const ProgramOptions& options = ProgramOptions()) {
    const DaemonPeer daemon;
    EXPECT_GOOD_END(Run({kPhotos}, options));
    return ReportedPhotos(daemon);
  }
};

TEST_F(Listing, TakesPhotosInByteOrder) {
  for (const char* name : {"b.jpg", "B.jpg", "a.jpg", "10.jpg", "9.jpg", "_.jpg", "\xc3\xa9.jpg"}) {
    MakePhoto(In(name));
  }
  EXPECT_THAT(RunAndGetReports(), ElementsAre(In("10.jpg"), In("9.jpg"), In("B.jpg"), In("_.jpg"),
                                              In("a.jpg"), In("b.jpg"), In("\xc3\xa9.jpg")));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Listing, FinishesOnePhotoBeforeTheNext) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("b.jpg"));
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ConvertedSources(), ElementsAre(In("a.jpg"), Thumb(In("a.jpg"), "XL"), In("b.jpg"),
                                              Thumb(In("b.jpg"), "XL")));
}

TEST_F(Listing, LeavesOutWhatIsNoPhoto) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("._a.jpg"));
  WriteFile(In("b.txt"), "");
  MakeDirectories(In("c.jpg"));
  MakePhoto(In(".d.jpg"));
  EXPECT_THAT(RunAndGetReports(), ElementsAre(In(".d.jpg"), In("a.jpg")));
  EXPECT_THAT(ListDirectory(kRoot), ElementsAre(".d.jpg", "a.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Listing, FollowsLinksToPhotos) {
  MakePhoto("/tmp/elsewhere.jpg");
  ASSERT_EQ(0, symlink("/tmp/elsewhere.jpg", In("link.jpg").c_str()));
  EXPECT_THAT(RunAndGetReports(), ElementsAre(In("link.jpg")));
  EXPECT_TRUE(Exists(Thumb(In("link.jpg"), "XL")));
  EXPECT_FALSE(Exists("/tmp/@eaDir"));
}

TEST_F(Listing, LogsLinksThatLeadNowhereAndGoesOn) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(0, symlink("nowhere", In("b.jpg").c_str()));
  MakePhoto(In("c.jpg"));
  EXPECT_THAT(RunAndGetReports(), ElementsAre(In("a.jpg"), In("c.jpg")));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:416 [Error] stat: /tmp/photos/b.jpg"));
}

TEST_F(Listing, LogsADirectoryThatMayBeEnteredButNotRead) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(0, chmod(kPhotos, 0300));
  ProgramOptions options;
  options.beforeExec = {DropCapabilities()};
  EXPECT_THAT(RunAndGetReports(options), IsEmpty());
  EXPECT_FALSE(Exists(kRoot));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:404 [Error] opendir: /tmp/photos"));
}

TEST_F(Listing, DirectoryWithoutPhotosGetsNoMetadata) {
  WriteFile(In("a.txt"), "");
  MakePhoto(In("._b.jpg"));
  MakeDirectories(In("c.jpg"));
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ListDirectory(kPhotos), ElementsAre("._b.jpg", "a.txt", "c.jpg"));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Listing, DirectoryWithoutPhotosIsNotLocked) {
  MakeDirectories(kRoot);
  const HeldLock lock(kRoot);
  ASSERT_TRUE(lock.IsHeld());
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Listing, MetadataDirectoriesAreMadeForEverybody) {
  MakePhoto(In("a.jpg"));
  ProgramOptions options;
  options.umask = 0077;
  EXPECT_GOOD_END(Run({kPhotos}, options));
  EXPECT_EQ(0777, ModeOf(kRoot));
  EXPECT_EQ(0777, ModeOf(MetadataDirOf(In("a.jpg"))));
}

TEST_F(Listing, MetadataDirectoriesThatAreThereStayAsTheyAre) {
  MakePhoto(In("a.jpg"));
  WriteFile(MetadataDirOf(In("a.jpg")) + "/film.flv", "kept");
  ASSERT_EQ(0, chmod(kRoot, 0750));
  ASSERT_EQ(0, chmod(MetadataDirOf(In("a.jpg")).c_str(), 0700));
  EXPECT_GOOD_END(Run());
  EXPECT_EQ(0750, ModeOf(kRoot));
  EXPECT_EQ(0700, ModeOf(MetadataDirOf(In("a.jpg"))));
  EXPECT_EQ("kept", ReadFile(MetadataDirOf(In("a.jpg")) + "/film.flv"));
}

TEST_F(Listing, RootThatCannotBeMadeEndsThePass) {
  MakePhoto(In("a.jpg"));
  ProgramOptions options;
  options.beforeExec = {SeccompFail(MkdirCalls(), ENOSPC)};
  EXPECT_THAT(RunAndGetReports(options), IsEmpty());
  EXPECT_THAT(ConvertedSources(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine(kRoot, ENOSPC)));
}

TEST_F(Listing, RootThatCannotBeMadeDoesNotStopTheNextDirectory) {
  MakePhoto(In("a.jpg"));
  MakePhoto("/tmp/second/a.jpg");
  MakeDirectories("/tmp/second/@eaDir/a.jpg");
  ProgramOptions options;
  options.beforeExec = {SeccompFail(MkdirCalls(), ENOSPC)};
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run({kPhotos, "/tmp/second"}, options));
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre("/tmp/second/a.jpg"));
}

TEST_F(Listing, RootThatIsALinkToNowhereCannotBeOpened) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(0, symlink("nowhere", kRoot));
  EXPECT_THAT(RunAndGetReports(), IsEmpty());
  EXPECT_THAT(ListDirectory(kPhotos), ElementsAre("@eaDir", "a.jpg"));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:844 Failed to open /tmp/photos/@eaDir"));
}

TEST_F(Listing, RootThatMayNotBeReadCannotBeOpened) {
  MakePhoto(In("a.jpg"));
  MakeDirectories(kRoot);
  ASSERT_EQ(0, chmod(kRoot, 0333));
  ProgramOptions options;
  options.beforeExec = {DropCapabilities()};
  EXPECT_THAT(RunAndGetReports(options), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:844 Failed to open /tmp/photos/@eaDir"));
}

TEST_F(Listing, RootThatIsAFileLetsEachPhotoFail) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("b.jpg"));
  WriteFile(kRoot, "mine");
  EXPECT_THAT(RunAndGetReports(), IsEmpty());
  EXPECT_EQ("mine", ReadFile(kRoot));
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine(MetadataDirOf(In("a.jpg")), ENOTDIR),
                                        MkdirLine(MetadataDirOf(In("b.jpg")), ENOTDIR)));
}

TEST_F(Listing, PhotoWithoutMetadataDirectoryIsPassedOver) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("b.jpg"));
  MakeDirectories(MetadataDirOf(In("b.jpg")));
  ProgramOptions options;
  options.beforeExec = {SeccompFail(MkdirCalls(), EDQUOT)};
  EXPECT_THAT(RunAndGetReports(options), ElementsAre(In("b.jpg")));
  EXPECT_THAT(ConvertedSources(), ElementsAre(In("b.jpg"), Thumb(In("b.jpg"), "XL")));
  EXPECT_EQ(3, Progress("completed_thumb"));
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine(MetadataDirOf(In("a.jpg")), EDQUOT)));
}

TEST_F(Listing, PhotoThatVanishesBeforeItsTurnIsPassedOver) {
  for (const char* name : {"a.jpg", "b.jpg", "c.jpg"}) {
    MakePhoto(In(name));
  }
  Converter().PlanCall(1, StubPlan().WriteOutputs().Remove(In("b.jpg")));
  EXPECT_THAT(RunAndGetReports(), ElementsAre(In("a.jpg"), In("c.jpg")));
  EXPECT_THAT(ListDirectory(kRoot), ElementsAre("a.jpg", "c.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Listing, PhotosAreListedOnce) {
  MakePhoto(In("a.jpg"));
  Converter().PlanCall(1, StubPlan().WriteOutputs().WriteFile(In("b.jpg"), "new"));
  EXPECT_THAT(RunAndGetReports(), ElementsAre(In("a.jpg")));
}

}  // namespace
}  // namespace vela_test
