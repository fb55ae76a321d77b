// The totals of the progress counters.
#include "progress_totals.h"

#include <sys/mount.h>
#include <unistd.h>

#include "platform/velaindex.h"
#include "progress/velamk_progress.h"
#include "queue_fixture.h"
#include "support/films.h"
#include "support/profile_file.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

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

  static void MakePhotos(const std::vector<std::string>& photos) {
    for (const std::string& photo : photos) {
      MakePhoto(photo);
    }
  }

  static void ExpectCounters(int completed, int total, int completedThumb, int totalThumb) {
    EXPECT_EQ(Photo("completed"), completed);
    EXPECT_EQ(Photo("total"), total);
    EXPECT_EQ(Photo("completed_thumb"), completedThumb);
    EXPECT_EQ(Photo("total_thumb"), totalThumb);
  }

  void ExpectCountersAfterRun(int completed, int total, int completedThumb, int totalThumb) const {
    EXPECT_EQ(velathumb_.Run().exitCode, 0);
    ExpectCounters(completed, total, completedThumb, totalThumb);
  }

  /// Requests two thumbnails of each photo.
  static void RequestTwoClasses() {
    WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"3\"\n");
  }
};

TEST_F(TotalsTest, AFreshRunStartsAtZero) {
  RequestTwoClasses();
  MakePhotos({"/tmp/p/a.jpg", "/tmp/p/b.jpg", "/tmp/q/c.jpg", "/tmp/q/below/d.jpg"});
  SetUpCounters(50, 70);
  Enqueue({"/tmp/p", "/tmp/q"});
  ExpectCountersAfterRun(0, 3, 0, 6);
}

TEST_F(TotalsTest, AResumedRunKeepsTheCounters) {
  RequestTwoClasses();
  MakePhotos({"/tmp/p/a.jpg", "/tmp/q/b.jpg"});
  SetUpCounters(50, 70);
  MakeEntryDirectories({"/tmp/p", "/tmp/q"});
  WriteFile(kTakenFile, "/tmp/p\n/tmp/q\n");
  WriteFile(kJournalFile, "/tmp/p\n");
  ExpectCountersAfterRun(50, 51, 70, 72);
}

TEST_F(TotalsTest, TheTotalsAreSetBeforeTheFirstStart) {
  MakePhoto("/tmp/p/a.jpg");
  Program runner = StartAndHold({"/tmp/p"});
  ExpectCounters(0, 1, 0, 1);
  Release();
  EXPECT_TRUE(runner.Wait());
}

TEST_F(TotalsTest, ATreeCountsAllBelow) {
  MakePhotos({"/tmp/p/a.jpg", "/tmp/p/d/b.jpg", "/tmp/p/d/e/c.jpg"});
  Enqueue({"R:/tmp/p"});
  ExpectCountersAfterRun(0, 3, 0, 3);
}

TEST_F(TotalsTest, EachDirectoryCountsOnceWhateverItsNames) {
  MakePhotos({"/tmp/p/a.jpg", "/tmp/p/d/b.jpg", "/tmp/p/d/e/c.jpg"});
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
    SCOPED_TRACE(Lines(queue));
    Enqueue(queue);
    ExpectCountersAfterRun(0, 3, 0, 3);
  }
}

TEST_F(TotalsTest, ADirectoryThatIsMountedTwiceCountsOnce) {
  MakePhoto("/tmp/p/a.jpg");
  MakeDirectories("/tmp/again");
  ASSERT_EQ(mount("/tmp/p", "/tmp/again", nullptr, MS_BIND, nullptr), 0);
  Enqueue({"/tmp/p", "/tmp/again"});
  ExpectCountersAfterRun(0, 1, 0, 1);
  EXPECT_EQ(velathumb_.Entries().size(), 2U);
}

TEST_F(TotalsTest, ADirectoryOfATreeCountsEvenWhenItIsQueuedItself) {
  MakePhotos({"/tmp/p/a.jpg", "/tmp/p/d/b.jpg"});
  WriteFile(kTakenFile, "R:/tmp/p\n");
  Program runner = StartAndHold({"/tmp/p/d"});
  ExpectCounters(0, 2, 0, 2);
  Release();
  EXPECT_TRUE(runner.Wait());
}

TEST_F(TotalsTest, AnAbortedScanSetsNothing) {
  for (int i = 0; i < 20; ++i) {
    MakePhoto("/tmp/p/" + std::to_string(i) + "/a.jpg");
  }
  SetUpCounters(50, 70);
  int queries = 0;
  ProgressTotals totals(false);
  totals.Set({"R:/tmp/p", "/tmp/p/3"}, [&] { return ++queries >= 10; });
  ExpectCounters(50, 1000, 70, 1000);
  EXPECT_GE(queries, 10) << "checked for each entry only, not for each directory of a tree";
  totals.Set({"R:/tmp/p", "/tmp/p/3"}, [] { return false; });
  ExpectCounters(50, 70, 70, 90);
}

TEST_F(TotalsTest, AnUpdateDoesNotTakeFailuresOutASecondTime) {
  const StubTool converter(kConverterPath);
  converter.Plan(StubPlan().Exit(1));
  MakePhoto("/tmp/p/bad.jpg");
  Enqueue({"/tmp/p"});
  ConvertQueue();
  ExpectCounters(1, 1, 1, 1);
  ProgressTotals totals(false);
  const auto goOn = [] { return false; };
  totals.Set({"/tmp/p"}, goOn);
  ExpectCounters(1, 2, 1, 2);
  totals.Update({"/tmp/p"}, goOn);
  ExpectCounters(1, 2, 1, 2);
}

/// All six size classes, in three phases.
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

  /// Makes the photos, of which kBad fails, and processes the queue. Fails the test unless the
  /// counters have reached their totals.
  void ExpectAllCounted(const std::vector<std::string>& photos,
                        const std::vector<std::string>& entries) {
    MakePhotos(photos);
    converter_.PlanWhen(kBad, StubPlan().Exit(1));
    Enqueue(entries);
    ConvertQueue();
    const int count = static_cast<int>(photos.size());
    ExpectCounters(count, count, count * 6, count * 6);
  }

  static constexpr const char* kBad = "/tmp/q/bad.jpg";
  StubTool converter_{kConverterPath};
};

TEST_F(AllPhasesTest, InTheEndTheTotalsAreReached) {
  SetUpCounters(7, 9);
  ExpectAllCounted({"/tmp/p/a.jpg", "/tmp/p/b.jpg", "/tmp/q/c.jpg", "/tmp/q/d/e.jpg"},
                   {"/tmp/p", "R:/tmp/q"});
}

TEST_F(AllPhasesTest, APhotoThatFailsCountsAsCompleted) {
  ExpectAllCounted({"/tmp/p/a.jpg", kBad}, {"/tmp/p", "/tmp/q"});
  EXPECT_EQ(ListDirectory("/tmp/q/@eaDir/bad.jpg").size(), 6U);
}

TEST_F(AllPhasesTest, APhotoThatFailsInEveryPhaseCountsOnce) {
  ExpectAllCounted({"/tmp/q/a.jpg", kBad}, {"/tmp/q"});
}

TEST_F(AllPhasesTest, OneDamagedPhotoOfThreeCountsAsOneOfThree) {
  ExpectAllCounted({"/tmp/q/a.jpg", kBad, "/tmp/q/c.jpg"}, {"/tmp/q"});
}

TEST_F(AllPhasesTest, APhotoThatFailedInAnEarlierRunCountsAgain) {
  for (int run = 0; run < 2; ++run) {
    ExpectAllCounted({kBad}, {"/tmp/q"});
  }
}

TEST_F(AllPhasesTest, AfterAKilledVelathumbTheTotalsAreCorrected) {
  MakePhotos({"/tmp/p/a.jpg", "/tmp/p/b.jpg"});
  converter_.PlanCall(2, StubPlan().SignalParent(SIGKILL).WriteOutputs());
  Enqueue({"/tmp/p"});
  EXPECT_EQ(RunRunner().exitCode, 0);
  EXPECT_EQ(Photo("completed"), Photo("total"));
  EXPECT_EQ(Photo("completed_thumb"), Photo("total_thumb"));
}

TEST_F(TotalsTest, VideosAreCountedWhenRequested) {
  MakeDirectories("/tmp/v/d");
  MakeFilm("/tmp/v/a.mp4");
  MakeFilm("/tmp/v/d/b.mp4");
  EXPECT_EQ(WriteIndexQueue("/tmp/v/a.mp4", "/var/spool/flv_create.queue"), 0);
  EXPECT_EQ(WriteIndexQueue("R:/tmp/v/d", "/var/spool/flv_create.queue.tmp"), 0);
  AddConvProgress(THUMB_TYPE_VIDEO, "completed", 3);
  AddConvProgress(THUMB_TYPE_VIDEO, "total", 1);
  Enqueue({"/tmp/p"});
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_EQ(GetConvProgress(THUMB_TYPE_VIDEO, "total"), 1);
  Enqueue({"/tmp/p"});
  EXPECT_EQ(velathumb_.Run({"--check-videos"}).exitCode, 0);
  EXPECT_EQ(GetConvProgress(THUMB_TYPE_VIDEO, "total"), 5);
  EXPECT_EQ(GetConvProgress(THUMB_TYPE_VIDEO, "completed"), 3);
}

TEST_F(TotalsTest, AProgressFileThatCannotBeWrittenIsNotFatal) {
  MakeDirectories("/var/spool/conv_progress_photo");
  Enqueue({"/tmp/p"});
  const ProgramResult result = velathumb_.Run();
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.err, HasSubstr("cannot write total in /var/spool/conv_progress_photo\n"));
  EXPECT_EQ(velathumb_.Entries().size(), 1U);
}

}  // namespace
}  // namespace vela_test
