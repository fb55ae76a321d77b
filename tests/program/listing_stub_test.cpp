// Which photos of a directory are processed, in which order, and their metadata directories.
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "program/stub_program_test.h"
#include "support/mounts.h"
#include "support/seccomp_fail.h"

namespace vela_test {
namespace {

constexpr const char* kRoot = "/tmp/photos/@eaDir";

/// The log line about a directory that could not be created.
std::string MkdirLine(const std::string& path, int error) {
  return "velathumb:447 velathumb: checkCreateDir(447) - mkdir(" + path +
         ", 0777 ), errno: " + std::to_string(error) + "\n";
}

/// The directory has a photo "a.jpg", unless a test removes it.
class Listing : public OnePhotoTest {
 protected:
  /// Runs the program with a daemon. Returns the photos reported, in order.
  static Strings RunAndGetReports(const ProgramOptions& options = ProgramOptions()) {
    return ReportedPhotos(RunWithDaemon({kPhotos}, options));
  }
};

TEST_F(Listing, TakesPhotosInByteOrder) {
  MakePhotos({"b.jpg", "B.jpg", "10.jpg", "9.jpg", "_.jpg", "\xc3\xa9.jpg"});
  EXPECT_THAT(RunAndGetReports(),
              ElementsAre(InPhotos("10.jpg"), InPhotos("9.jpg"), InPhotos("B.jpg"),
                          InPhotos("_.jpg"), kPhoto, InPhotos("b.jpg"), InPhotos("\xc3\xa9.jpg")));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Listing, FinishesOnePhotoBeforeTheNext) {
  MakePhotos({"b.jpg"});
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPhoto, Thumb(kPhoto, "XL"), InPhotos("b.jpg"),
                                              Thumb(InPhotos("b.jpg"), "XL")));
}

TEST_F(Listing, SkipsOtherFiles) {
  MakePhotos({"._a.jpg"});
  WriteFile(InPhotos("b.txt"), "");
  MakeDirectories(InPhotos("c.jpg"));
  MakePhoto(InPhotos(".d.jpg"));
  EXPECT_THAT(RunAndGetReports(), ElementsAre(InPhotos(".d.jpg"), kPhoto));
  EXPECT_THAT(ListDirectory(kRoot), ElementsAre(".d.jpg", "a.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Listing, FollowsLinksToPhotos) {
  ASSERT_EQ(unlink(kPhoto), 0);
  MakePhoto("/tmp/elsewhere.jpg");
  ASSERT_EQ(symlink("/tmp/elsewhere.jpg", InPhotos("link.jpg").c_str()), 0);
  EXPECT_THAT(RunAndGetReports(), ElementsAre(InPhotos("link.jpg")));
  EXPECT_TRUE(Exists(Thumb(InPhotos("link.jpg"), "XL")));
  EXPECT_FALSE(Exists("/tmp/@eaDir"));
}

TEST_F(Listing, LogsDanglingLinksAndContinues) {
  ASSERT_EQ(symlink("nowhere", InPhotos("b.jpg").c_str()), 0);
  MakePhoto(InPhotos("c.jpg"));
  EXPECT_THAT(RunAndGetReports(), ElementsAre(kPhoto, InPhotos("c.jpg")));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:416 [Error] stat: /tmp/photos/b.jpg"));
}

TEST_F(Listing, LogsADirectoryThatMayBeEnteredButNotRead) {
  ASSERT_EQ(chmod(kPhotos, 0300), 0);
  EXPECT_THAT(RunAndGetReports(WithSteps({DropCapabilities()})), IsEmpty());
  EXPECT_FALSE(Exists(kRoot));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:404 [Error] opendir: /tmp/photos"));
}

TEST_F(Listing, DirectoryWithoutPhotosGetsNoMetadata) {
  ASSERT_EQ(unlink(kPhoto), 0);
  WriteFile(InPhotos("a.txt"), "");
  MakePhoto(InPhotos("._b.jpg"));
  MakeDirectories(InPhotos("c.jpg"));
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(ListDirectory(kPhotos), ElementsAre("._b.jpg", "a.txt", "c.jpg"));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Listing, DirectoryWithoutPhotosIsNotLocked) {
  ASSERT_EQ(unlink(kPhoto), 0);
  MakeDirectories(kRoot);
  const HeldLock lock(kRoot);
  ASSERT_TRUE(lock.IsHeld());
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Listing, MetadataDirectoriesAreWritableByAll) {
  EXPECT_SUCCESS(Run({kPhotos}, WithUmask(0077)));
  EXPECT_EQ(ModeOf(kRoot), 0777);
  EXPECT_EQ(ModeOf(MetadataDirOf(kPhoto)), 0777);
}

TEST_F(Listing, ExistingMetadataDirectoriesStayAsTheyAre) {
  WriteFile(MetadataDirOf(kPhoto) + "/film.flv", "kept");
  ASSERT_EQ(chmod(kRoot, 0750), 0);
  ASSERT_EQ(chmod(MetadataDirOf(kPhoto).c_str(), 0700), 0);
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(ModeOf(kRoot), 0750);
  EXPECT_EQ(ModeOf(MetadataDirOf(kPhoto)), 0700);
  EXPECT_EQ(ReadFile(MetadataDirOf(kPhoto) + "/film.flv"), "kept");
}

TEST_F(Listing, RootThatCannotBeMadeEndsThePass) {
  EXPECT_THAT(RunAndGetReports(WithSteps({SeccompFail(MkdirCalls(), ENOSPC)})), IsEmpty());
  EXPECT_THAT(ConvertedSources(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine(kRoot, ENOSPC)));
}

TEST_F(Listing, RootThatCannotBeMadeDoesNotStopTheNextDirectory) {
  MakePhoto("/tmp/second/a.jpg");
  MakeDirectories("/tmp/second/@eaDir/a.jpg");
  EXPECT_THAT(ReportedPhotos(RunWithDaemon({kPhotos, "/tmp/second"},
                                           WithSteps({SeccompFail(MkdirCalls(), ENOSPC)}))),
              ElementsAre("/tmp/second/a.jpg"));
}

TEST_F(Listing, RootThatIsADanglingLinkCannotBeOpened) {
  ASSERT_EQ(symlink("nowhere", kRoot), 0);
  EXPECT_THAT(RunAndGetReports(), IsEmpty());
  EXPECT_THAT(ListDirectory(kPhotos), ElementsAre("@eaDir", "a.jpg"));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:844 Failed to open /tmp/photos/@eaDir"));
}

TEST_F(Listing, RootThatMayNotBeReadCannotBeOpened) {
  MakeDirectories(kRoot);
  ASSERT_EQ(chmod(kRoot, 0333), 0);
  EXPECT_THAT(RunAndGetReports(WithSteps({DropCapabilities()})), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:844 Failed to open /tmp/photos/@eaDir"));
}

TEST_F(Listing, RootThatIsAFileLetsEachPhotoFail) {
  MakePhotos({"b.jpg"});
  WriteFile(kRoot, "mine");
  EXPECT_THAT(RunAndGetReports(), IsEmpty());
  EXPECT_EQ(ReadFile(kRoot), "mine");
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine(MetadataDirOf(kPhoto), ENOTDIR),
                                        MkdirLine(MetadataDirOf(InPhotos("b.jpg")), ENOTDIR)));
}

TEST_F(Listing, PhotoWithoutMetadataDirectoryIsSkipped) {
  MakePhotos({"b.jpg"});
  MakeDirectories(MetadataDirOf(InPhotos("b.jpg")));
  EXPECT_THAT(RunAndGetReports(WithSteps({SeccompFail(MkdirCalls(), EDQUOT)})),
              ElementsAre(InPhotos("b.jpg")));
  EXPECT_THAT(ConvertedSources(), ElementsAre(InPhotos("b.jpg"), Thumb(InPhotos("b.jpg"), "XL")));
  EXPECT_EQ(Progress("completed_thumb"), 3);
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine(MetadataDirOf(kPhoto), EDQUOT)));
}

TEST_F(Listing, PhotoThatVanishesBeforeItsTurnIsSkipped) {
  MakePhotos({"b.jpg", "c.jpg"});
  Converter().PlanCall(1, StubPlan().WriteOutputs().Remove(InPhotos("b.jpg")));
  EXPECT_THAT(RunAndGetReports(), ElementsAre(kPhoto, InPhotos("c.jpg")));
  EXPECT_THAT(ListDirectory(kRoot), ElementsAre("a.jpg", "c.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Listing, PhotosAreListedOnce) {
  Converter().PlanCall(1, StubPlan().WriteOutputs().WriteFile(InPhotos("b.jpg"), "new"));
  EXPECT_THAT(RunAndGetReports(), ElementsAre(kPhoto));
}

}  // namespace
}  // namespace vela_test
