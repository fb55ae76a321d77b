// The totals that the counters of progress count towards.
#include "progress_totals.h"

#include <gmock/gmock.h>
#include <sys/mount.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "platform/velaindex.h"
#include "progress/velamk_progress.h"
#include "queue_fixture.h"
#include "support/files.h"
#include "support/films.h"
#include "support/profile_file.h"
#include "support/stub_tool.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::HasSubstr;

int Photo(const char* key) {
  return GetConvProgress(THUMB_TYPE_PHOTO, key);
}

class TotalsTest : public QueueTest {
 protected:
  static void SetUpCounters(int completed, int completedThumb) {
    AddConvProgress(THUMB_TYPE_PHOTO, "completed", completed);
    AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", completedThumb);
    AddConvProgress(THUMB_TYPE_PHOTO, "total", 1000);
    AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", 1000);
  }

  static void ExpectCounters(int completed, int total, int completedThumb, int totalThumb) {
    EXPECT_EQ(Photo("completed"), completed);
    EXPECT_EQ(Photo("total"), total);
    EXPECT_EQ(Photo("completed_thumb"), completedThumb);
    EXPECT_EQ(Photo("total_thumb"), totalThumb);
  }

  /// One thumbnail of two classes each.
  static void AskForTwoClasses() {
    WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"3\"\n");
  }
};

TEST_F(TotalsTest, AFreshRunBeginsAtZero) {
  const RecordingVelathumb velathumb;
  AskForTwoClasses();
  MakePhoto("/tmp/p/a.jpg");
  MakePhoto("/tmp/p/b.jpg");
  MakePhoto("/tmp/q/c.jpg");
  MakePhoto("/tmp/q/below/d.jpg");
  SetUpCounters(50, 70);
  Enqueue({"/tmp/p", "/tmp/q"});
  EXPECT_EQ(velathumb.Run().exitCode, 0);
  ExpectCounters(0, 3, 0, 6);
}

TEST_F(TotalsTest, ARunThatGoesOnKeepsTheCounters) {
  const RecordingVelathumb velathumb;
  AskForTwoClasses();
  MakePhoto("/tmp/p/a.jpg");
  MakePhoto("/tmp/q/b.jpg");
  SetUpCounters(50, 70);
  MakeEntryDirectories({"/tmp/p", "/tmp/q"});
  WriteFile(kTakenFile, "/tmp/p\n/tmp/q\n");
  WriteFile(kJournalFile, "/tmp/p\n");
  EXPECT_EQ(velathumb.Run().exitCode, 0);
  ExpectCounters(50, 51, 70, 72);
}

TEST_F(TotalsTest, TheTotalsAreThereBeforeTheFirstStart) {
  RecordingVelathumb velathumb;
  velathumb.Stub().Plan(StubPlan().WaitForFile("/tmp/go"));
  MakePhoto("/tmp/p/a.jpg");
  Enqueue({"/tmp/p"});
  Program runner = velathumb.Start();
  ASSERT_TRUE(velathumb.WaitForStarts(1));
  ExpectCounters(0, 1, 0, 1);
  WriteFile("/tmp/go", "");
  EXPECT_TRUE(runner.Wait());
}

TEST_F(TotalsTest, ATreeCountsAllBelow) {
  const RecordingVelathumb velathumb;
  MakePhoto("/tmp/p/a.jpg");
  MakePhoto("/tmp/p/d/b.jpg");
  MakePhoto("/tmp/p/d/e/c.jpg");
  Enqueue({"R:/tmp/p"});
  EXPECT_EQ(velathumb.Run().exitCode, 0);
  ExpectCounters(0, 3, 0, 3);
}

TEST_F(TotalsTest, EachDirectoryCountsOnceByWhateverNames) {
  const RecordingVelathumb velathumb;
  MakePhoto("/tmp/p/a.jpg");
  MakePhoto("/tmp/p/d/b.jpg");
  MakePhoto("/tmp/p/d/e/c.jpg");
  ASSERT_EQ(symlink("p", "/tmp/alias"), 0);
  const std::vector<std::vector<std::string>> queues = {
      {"R:/tmp/p", "/tmp/p/d"},
      {"/tmp/p/d", "R:/tmp/p", "/tmp/p"},
      {"R:/tmp/p", "R:/tmp/p/d"},
      {"R:/tmp/p/d/e", "R:/tmp/p/d", "R:/tmp/p", "R:/tmp/alias"},
      {"R:/tmp/p", "/tmp/alias/d", "/tmp/p/"},
      {"/tmp/p", "/tmp/alias", "/tmp/p/", "R:/tmp/p/d", "/tmp/alias/d/e"},
      {"R:/tmp/alias", "/tmp/p/d", "/tmp/p/d/e", "/tmp/alias/d"},
  };
  for (const std::vector<std::string>& queue : queues) {
    Enqueue(queue);
    EXPECT_EQ(velathumb.Run().exitCode, 0);
    SCOPED_TRACE(Lines(queue));
    ExpectCounters(0, 3, 0, 3);
  }
}

TEST_F(TotalsTest, ADirectoryThatIsMountedTwiceCountsOnce) {
  const RecordingVelathumb velathumb;
  MakePhoto("/tmp/p/a.jpg");
  MakeDirectories("/tmp/again");
  ASSERT_EQ(mount("/tmp/p", "/tmp/again", nullptr, MS_BIND, nullptr), 0);
  Enqueue({"/tmp/p", "/tmp/again"});
  EXPECT_EQ(velathumb.Run().exitCode, 0);
  ExpectCounters(0, 1, 0, 1);
  EXPECT_EQ(velathumb.Entries().size(), 2U);
}

TEST_F(TotalsTest, ADirectoryOfATreeCountsAlsoWhenItWaitsInTheQueueItself) {
  RecordingVelathumb velathumb;
  velathumb.Stub().PlanCall(1, StubPlan().WaitForFile("/tmp/go"));
  MakePhoto("/tmp/p/a.jpg");
  MakePhoto("/tmp/p/d/b.jpg");
  WriteFile(kTakenFile, "R:/tmp/p\n");
  Enqueue({"/tmp/p/d"});
  Program runner = velathumb.Start();
  ASSERT_TRUE(velathumb.WaitForStarts(1));
  ExpectCounters(0, 2, 0, 2);
  WriteFile("/tmp/go", "");
  EXPECT_TRUE(runner.Wait());
}

TEST_F(TotalsTest, AScanThatIsGivenUpSetsNothing) {
  for (int i = 0; i < 20; ++i) {
    MakePhoto("/tmp/p/" + std::to_string(i) + "/a.jpg");
  }
  SetUpCounters(50, 70);
  int questions = 0;
  ProgressTotals totals(false);
  totals.Set({"R:/tmp/p", "/tmp/p/3"}, [&] { return ++questions >= 10; });
  ExpectCounters(50, 1000, 70, 1000);
  EXPECT_GE(questions, 10) << "asked for each entry only, not for each directory of a tree";
  totals.Set({"R:/tmp/p", "/tmp/p/3"}, [] { return false; });
  ExpectCounters(50, 70, 70, 90);
}

/// All six classes, in three phases.
class AllPhasesTest : public TotalsTest {
 protected:
  AllPhasesTest() {
    WriteFile("/etc/velainfo.conf", "");
    WriteProfileFile(kProfiles, {{"thumb_xl", 1280, 80, std::nullopt, "VELAPHOTO_THUMB_XL.jpg", 0},
                                 {"thumb_l", 800, 80, std::nullopt, "VELAPHOTO_THUMB_L.jpg", 1},
                                 {"thumb_m", 320, 80, std::nullopt, "VELAPHOTO_THUMB_M.jpg", 1},
                                 {"thumb_sm", 240, 80, std::nullopt, "VELAPHOTO_THUMB_SM.jpg", 1},
                                 {"thumb_b", 640, 80, std::nullopt, "VELAPHOTO_THUMB_B.jpg", 2},
                                 {"thumb_s", 120, 80, std::nullopt, "VELAPHOTO_THUMB_S.jpg", 2}});
  }

  StubTool converter_{kConverterPath};
};

TEST_F(AllPhasesTest, InTheEndWhatIsDoneIsTheTotal) {
  for (const char* photo : {"/tmp/p/a.jpg", "/tmp/p/b.jpg", "/tmp/q/c.jpg", "/tmp/q/d/e.jpg"}) {
    MakePhoto(photo);
  }
  SetUpCounters(7, 9);
  Enqueue({"/tmp/p", "R:/tmp/q"});
  EXPECT_EQ(RunRunner().exitCode, 0);
  ExpectCounters(4, 4, 24, 24);
  ExpectNothingWaits();
}

TEST_F(AllPhasesTest, APhotoThatFailsCountsAsDone) {
  MakePhoto("/tmp/p/a.jpg");
  MakePhoto("/tmp/q/bad.jpg");
  converter_.PlanWhen("/tmp/q/bad.jpg", StubPlan().Exit(1));
  Enqueue({"/tmp/p", "/tmp/q"});
  EXPECT_EQ(RunRunner().exitCode, 0);
  ExpectCounters(2, 2, 12, 12);
  EXPECT_EQ(ListDirectory("/tmp/q/@eaDir/bad.jpg").size(), 6U);
}

TEST_F(AllPhasesTest, APhotoThatFailsAgainWhenItsDirectoryComesBackCountsOnce) {
  MakePhoto("/tmp/p/a.jpg");
  MakePhoto("/tmp/p/bad.jpg");
  converter_.PlanWhen("/tmp/p/bad.jpg", StubPlan().Exit(1));
  Enqueue({"/tmp/p"});
  EXPECT_EQ(RunRunner().exitCode, 0);
  // One that failed in the round before is not one more.
  ExpectCounters(2, 2, 12, 12);
}

TEST_F(AllPhasesTest, OneDamagedPhotoOfThreeIsOneOfThreeInTheEnd) {
  for (const char* photo : {"/tmp/p/a.jpg", "/tmp/p/bad.jpg", "/tmp/p/c.jpg"}) {
    MakePhoto(photo);
  }
  converter_.PlanWhen("/tmp/p/bad.jpg", StubPlan().Exit(1));
  Enqueue({"/tmp/p"});
  EXPECT_EQ(RunRunner().exitCode, 0);
  ExpectCounters(3, 3, 18, 18);
}

TEST_F(AllPhasesTest, APhotoThatFailedInAnEarlierRunIsOneToDo) {
  MakePhoto("/tmp/p/bad.jpg");
  converter_.PlanWhen("/tmp/p/bad.jpg", StubPlan().Exit(1));
  for (int run = 0; run < 2; ++run) {
    Enqueue({"/tmp/p"});
    EXPECT_EQ(RunRunner().exitCode, 0);
    ExpectCounters(1, 1, 6, 6);
  }
}

TEST_F(AllPhasesTest, AfterAKilledVelathumbTheNextTakeSetsTheTotalsRight) {
  MakePhoto("/tmp/p/a.jpg");
  MakePhoto("/tmp/p/b.jpg");
  converter_.PlanCall(2, StubPlan().SignalParent(SIGKILL).WriteOutputs());
  Enqueue({"/tmp/p"});
  EXPECT_EQ(RunRunner().exitCode, 0);
  EXPECT_EQ(Photo("completed"), Photo("total"));
  EXPECT_EQ(Photo("completed_thumb"), Photo("total_thumb"));
}

TEST_F(TotalsTest, VideosAreCountedWhenAskedFor) {
  const RecordingVelathumb velathumb;
  MakeDirectories("/tmp/v/d");
  MakeFilm("/tmp/v/a.mp4");
  MakeFilm("/tmp/v/d/b.mp4");
  EXPECT_EQ(WriteIndexQueue("/tmp/v/a.mp4", "/var/spool/flv_create.queue"), 0);
  EXPECT_EQ(WriteIndexQueue("R:/tmp/v/d", "/var/spool/flv_create.queue.tmp"), 0);
  AddConvProgress(THUMB_TYPE_VIDEO, "completed", 3);
  AddConvProgress(THUMB_TYPE_VIDEO, "total", 1);
  Enqueue({"/tmp/p"});
  EXPECT_EQ(velathumb.Run().exitCode, 0);
  EXPECT_EQ(GetConvProgress(THUMB_TYPE_VIDEO, "total"), 1);
  Enqueue({"/tmp/p"});
  EXPECT_EQ(velathumb.Run({"--check-videos"}).exitCode, 0);
  EXPECT_EQ(GetConvProgress(THUMB_TYPE_VIDEO, "total"), 5);
  EXPECT_EQ(GetConvProgress(THUMB_TYPE_VIDEO, "completed"), 3);
}

TEST_F(TotalsTest, AProgressFileThatCannotBeWrittenHoldsNothingBack) {
  const RecordingVelathumb velathumb;
  MakeDirectories("/var/spool/conv_progress_photo");
  Enqueue({"/tmp/p"});
  const ProgramResult result = velathumb.Run();
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.err, HasSubstr("cannot write total in /var/spool/conv_progress_photo\n"));
  EXPECT_EQ(velathumb.Entries().size(), 1U);
}

}  // namespace
}  // namespace vela_test
