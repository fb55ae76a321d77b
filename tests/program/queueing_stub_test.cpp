// The queue of directories that need a later run.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "program/callback_daemon.h"
#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class Queueing : public StubProgramTest {
 protected:
  static std::string In(const std::string& name) { return std::string(kPhotos) + "/" + name; }
};

TEST_F(Queueing, ADirectoryIsWrittenOnceHoweverManyPhotosNeedIt) {
  for (const char* name : {"a.jpg", "b.jpg", "c.jpg"}) {
    MakePhoto(In(name));
  }
  EXPECT_GOOD_END(Run());
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
  EXPECT_EQ(0644, ModeOf(kQueue));
}

TEST_F(Queueing, OnePhotoOfSeveralIsEnough) {
  for (const char* name : {"a.jpg", "b.jpg", "c.jpg"}) {
    MakePhoto(In(name));
  }
  PutThumbs(In("c.jpg"), {"XL", "M", "B"});
  Converter().PlanWhen(In("b.jpg"), StubPlan().Exit(1));
  EXPECT_GOOD_END(Run());
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
}

TEST_F(Queueing, IsNotDoneWithoutPhase1) {
  for (const char* name : {"a.jpg", "b.jpg", "c.jpg"}) {
    MakePhoto(In(name));
  }
  PutThumbs(In("a.jpg"), {"XL", "M", "B"});
  PutThumbs(In("c.jpg"), {"XL", "M", "B", "S"});
  Converter().PlanWhen(In("b.jpg"), StubPlan().Exit(1));
  EXPECT_GOOD_END(Run());
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(Queueing, IsDoneAtTheEndOfThePass) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("b.jpg"));
  bool early = false;
  CallbackDaemon daemon([&](const std::string&, const std::string&) {
    early = early || Exists(kQueue);
    return kDone;
  });
  EXPECT_GOOD_END(Run());
  daemon.Stop();
  EXPECT_FALSE(early);
  EXPECT_TRUE(Exists(kQueue));
}

TEST_F(Queueing, IsDoneForEachDirectoryAtItsEnd) {
  MakePhoto("/tmp/1/a.jpg");
  MakePhoto("/tmp/2/a.jpg");
  MakePhoto("/tmp/3/a.jpg");
  PutThumbs("/tmp/2/a.jpg", {"XL", "M", "B"});
  Converter().PlanWhen(Thumb("/tmp/2/a.jpg", "XL"),
                       StubPlan().WriteOutputs().Run("/bin/cp", {kQueue, "/tmp/queue"}).Exit(0));
  EXPECT_GOOD_END(Run({"/tmp/1", "/tmp/2", "R:/tmp/3"}));
  EXPECT_EQ("/tmp/1\n", ReadFile("/tmp/queue"));
  EXPECT_EQ("/tmp/1\n/tmp/3\n", ReadFile(kQueue));
}

TEST_F(Queueing, AddsToWhatIsThere) {
  MakePhoto(In("a.jpg"));
  WriteFile(kQueue, "/somewhere/else\nR:/a/tree\n");
  EXPECT_GOOD_END(Run());
  EXPECT_EQ("/somewhere/else\nR:/a/tree\n/tmp/photos\n", ReadFile(kQueue));
}

TEST_F(Queueing, TouchesNoOtherFileOfTheSpoolDirectory) {
  MakePhoto(In("a.jpg"));
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ListDirectory("/var/spool"),
              ElementsAre("conv_progress_photo", "thumb_create.queue"));
}

TEST_F(Queueing, FailureIsLogged) {
  const DaemonPeer daemon;
  MakePhoto(In("a.jpg"));
  MakeDirectories(kQueue);
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:1112 Failed to write [/tmp/photos] to thumb queue"));
  EXPECT_TRUE(HeldLock("/tmp/photos/@eaDir").IsHeld());
}

TEST_F(Queueing, FailureDoesNotStopTheNextDirectory) {
  const DaemonPeer daemon;
  MakePhoto("/tmp/1/a.jpg");
  MakePhoto("/tmp/2%s/a.jpg");
  MakeDirectories(kQueue);
  EXPECT_GOOD_END(Run({"/tmp/1", "/tmp/2%s"}));
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre("/tmp/1/a.jpg", "/tmp/2%s/a.jpg"));
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:1112 Failed to write [/tmp/1] to thumb queue",
                          "velathumb:1112 Failed to write [/tmp/2%s] to thumb queue"));
}

TEST_F(Queueing, DirectoryThatNoLineCanHoldIsLogged) {
  const DaemonPeer daemon;
  MakePhoto("/tmp/two\nlines/a.jpg");
  EXPECT_GOOD_END(Run({"/tmp/two\nlines"}));
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:1112 Failed to write [/tmp/two\nlines] to thumb queue"));
}

TEST_F(Queueing, ReadOnlySpoolDirectoryIsLoggedThroughout) {
  const DaemonPeer daemon;
  MakePhoto(In("a.jpg"));
  const ReadOnlyMount mount("/var/spool");
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre(In("a.jpg")));
  const std::string progress =
      "velamk_progress:115 VLIBCFileSetKeyValue fail: /var/spool/conv_progress_photo";
  EXPECT_THAT(ErrorLines(),
              ElementsAre(progress, progress,
                          "velathumb:1112 Failed to write [/tmp/photos] to thumb queue"));
}

}  // namespace
}  // namespace vela_test
