// The queue of directories that need a later run.
#include <fcntl.h>
#include <sys/file.h>

#include "program/stub_program_test.h"
#include "support/descriptor.h"
#include "support/mounts.h"

namespace vela_test {
namespace {

using Queueing = StubProgramTest;

TEST_F(Queueing, ADirectoryIsWrittenOnceHoweverManyPhotosNeedIt) {
  MakePhotos({"a.jpg", "b.jpg", "c.jpg"});
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(ReadFile(kQueue), "/tmp/photos\n");
  EXPECT_EQ(ModeOf(kQueue), 0644);
}

TEST_F(Queueing, OnePhotoOfSeveralIsEnough) {
  MakePhotos({"a.jpg", "b.jpg", "c.jpg"});
  PutThumbs(InPhotos("c.jpg"), {"XL", "M", "B"});
  Converter().PlanWhen(InPhotos("b.jpg"), StubPlan().Exit(1));
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(ReadFile(kQueue), "/tmp/photos\n");
}

TEST_F(Queueing, IsNotDoneWithoutPhase1) {
  MakePhotos({"a.jpg", "b.jpg", "c.jpg"});
  PutThumbs(InPhotos("a.jpg"), {"XL", "M", "B"});
  PutThumbs(InPhotos("c.jpg"), {"XL", "M", "B", "S"});
  Converter().PlanWhen(InPhotos("b.jpg"), StubPlan().Exit(1));
  EXPECT_SUCCESS(Run());
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(Queueing, IsDoneAtTheEndOfThePass) {
  MakePhotos({"a.jpg", "b.jpg"});
  bool early = false;
  RunAndObserve([&](const std::string&) { early = early || Exists(kQueue); });
  EXPECT_FALSE(early);
  EXPECT_TRUE(Exists(kQueue));
}

TEST_F(Queueing, IsDoneForEachDirectoryAtItsEnd) {
  MakePhotosIn({"/tmp/1", "/tmp/2", "/tmp/3"});
  PutThumbs("/tmp/2/a.jpg", {"XL", "M", "B"});
  Converter().PlanWhen(Thumb("/tmp/2/a.jpg", "XL"),
                       StubPlan().WriteOutputs().Run("/bin/cp", {kQueue, "/tmp/queue"}).Exit(0));
  EXPECT_SUCCESS(Run({"/tmp/1", "/tmp/2", "R:/tmp/3"}));
  EXPECT_EQ(ReadFile("/tmp/queue"), "/tmp/1\n");
  EXPECT_EQ(ReadFile(kQueue), "/tmp/1\n/tmp/3\n");
}

TEST_F(Queueing, AppendsToAnExistingQueue) {
  MakePhoto(InPhotos("a.jpg"));
  WriteFile(kQueue, "/somewhere/else\nR:/a/tree\n");
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(ReadFile(kQueue), "/somewhere/else\nR:/a/tree\n/tmp/photos\n");
}

TEST_F(Queueing, TouchesNoOtherFileOfTheSpoolDirectory) {
  MakePhoto(InPhotos("a.jpg"));
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(ListDirectory("/var/spool"),
              ElementsAre("conv_progress_photo", "thumb_create.queue"));
}

TEST_F(Queueing, FailureIsLogged) {
  MakePhoto(InPhotos("a.jpg"));
  MakeDirectories(kQueue);
  RunWithDaemon();
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:1112 Failed to write [/tmp/photos] to thumb queue"));
  EXPECT_TRUE(HeldLock("/tmp/photos/@eaDir").IsHeld());
}

TEST_F(Queueing, FailureDoesNotStopTheNextDirectory) {
  MakePhotosIn({"/tmp/1", "/tmp/2%s"});
  MakeDirectories(kQueue);
  EXPECT_THAT(ReportedPhotos(RunWithDaemon({"/tmp/1", "/tmp/2%s"})),
              ElementsAre("/tmp/1/a.jpg", "/tmp/2%s/a.jpg"));
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:1112 Failed to write [/tmp/1] to thumb queue",
                          "velathumb:1112 Failed to write [/tmp/2%s] to thumb queue"));
}

TEST_F(Queueing, DirectoryThatDoesNotFitOnALineIsLogged) {
  MakePhoto("/tmp/two\nlines/a.jpg");
  RunWithDaemon({"/tmp/two\nlines"});
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:1112 Failed to write [/tmp/two\nlines] to thumb queue"));
}

TEST_F(Queueing, ReadOnlySpoolDirectoryIsLoggedThroughout) {
  MakePhoto(InPhotos("a.jpg"));
  const ReadOnlyMount mount("/var/spool");
  EXPECT_THAT(ReportedPhotos(RunWithDaemon()), ElementsAre(InPhotos("a.jpg")));
  const std::string progress =
      "velamk_progress:115 VLIBCFileSetKeyValue fail: /var/spool/conv_progress_photo";
  EXPECT_THAT(ErrorLines(),
              ElementsAre(progress, progress,
                          "velathumb:1112 Failed to write [/tmp/photos] to thumb queue"));
}

/// Opens the file as any user can, and locks it.
Descriptor LockAsReader(const char* path) {
  Descriptor file(open(path, O_RDONLY | O_CLOEXEC));
  EXPECT_EQ(flock(file.Get(), LOCK_SH), 0) << path;
  return file;
}

TEST_F(Queueing, ReadersThatLockTheFilesOfTheSpoolDirectoryDoNotStopIt) {
  constexpr const char* kCounters = "/var/spool/conv_progress_photo";
  MakePhoto(InPhotos("a.jpg"));
  WriteFile(kCounters, "completed_thumb=\"5\"\n");
  WriteFile(kQueue, "/somewhere/else\n");
  const Descriptor counters = LockAsReader(kCounters);
  const Descriptor queue = LockAsReader(kQueue);
  ProgramOptions options;
  options.timeLimit = std::chrono::seconds(30);
  EXPECT_SUCCESS(Run({kPhotos}, options));
  EXPECT_EQ(ReadFile(kQueue), "/somewhere/else\n/tmp/photos\n");
  EXPECT_NE(ReadFile(kCounters), "completed_thumb=\"5\"\n");
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
}

}  // namespace
}  // namespace vela_test
