// Entries that cannot be processed now, and files of the queue that are locked.
#include <fcntl.h>

#include <algorithm>

#include "queue_fixture.h"
#include "support/mounts.h"

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::milliseconds;
using std::chrono::seconds;

constexpr uint64_t kGibibyte = uint64_t{1} << 30;

class LaterTest : public QueueTest {
 protected:
  /// Fails the test unless the run ends with status 1 and exactly these entries are
  /// deferred. Returns what the runner printed to standard error.
  std::string ExpectRunDefers(const std::vector<std::string>& entries) const {
    const ProgramResult result = velathumb_.Run();
    EXPECT_EQ(result.exitCode, 1);
    ExpectDeferred(entries);
    return result.err;
  }

  /// Fails the test unless exactly these entries are deferred.
  static void ExpectDeferred(const std::vector<std::string>& entries) {
    EXPECT_EQ(ReadFile(kLaterFile), Lines(entries));
    for (const char* file : {kQueueFile, kTakenFile, kJournalFile}) {
      EXPECT_FALSE(Exists(file)) << file;
    }
  }
};

TEST_F(LaterTest, AMissingDirectoryIsDeferredUntilItExists) {
  AppendToQueue({"/tmp/none", "R:/tmp/gone"});
  Enqueue({"/tmp/a"});
  EXPECT_THAT(ExpectRunDefers({"/tmp/none", "R:/tmp/gone"}),
              HasSubstr("deferred to a later run, there is no such directory: R:/tmp/gone\n"));
  MakeDirectories("/tmp/gone");
  ExpectRunDefers({"/tmp/none"});
  MakeDirectories("/tmp/none");
  ExpectRun({"/tmp/a", "R:/tmp/gone", "/tmp/none"});
}

TEST_F(LaterTest, ADirectoryThatIsRemovedMeanwhileIsDeferred) {
  velathumb_.Stub().PlanCall(1, StubPlan().Remove("/tmp/a"));
  Enqueue({"/tmp/a"});
  ExpectRunDefers({"/tmp/a"});
}

TEST_F(LaterTest, ANearlyFullVolumeIsDeferredUntilItHasRoom) {
  SmallVolume volume("/tmp/small", 2 * kGibibyte);
  WriteFile("/tmp/small/file", "");
  volume.SetAvailable(kGibibyte - SmallVolume::PageSize());
  Enqueue({"/tmp/small", "/tmp/a"});
  EXPECT_THAT(ExpectRunDefers({"/tmp/small"}),
              HasSubstr("deferred to a later run, its volume is nearly full: /tmp/small\n"));
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  volume.SetAvailable(kGibibyte);
  ExpectRun({"/tmp/a", "/tmp/small"});
}

TEST_F(LaterTest, AVolumeThatBecomesNearlyFullIsRepeated) {
  SmallVolume volume("/tmp/small", 2 * kGibibyte);
  WriteFile("/tmp/small/file", "x");
  velathumb_.Stub().PlanCall(1, StubPlan().FillVolume("/tmp/small"));
  Enqueue({"/tmp/small"});
  ExpectRunDefers({"/tmp/small"});
  volume.SetAvailable(2 * kGibibyte);
  ExpectRun({"/tmp/small", "/tmp/small"});
}

TEST_F(LaterTest, AReadOnlyVolumeIsDeferredUntilItIsWritable) {
  MakeDirectories("/tmp/disc");
  Enqueue({"/tmp/disc/a", "R:/tmp/disc/tree", "/tmp/a"});
  {
    const ReadOnlyMount disc("/tmp/disc");
    EXPECT_THAT(ExpectRunDefers({"/tmp/disc/a", "R:/tmp/disc/tree"}),
                AllOf(HasSubstr("velathumb-queue: deferred to a later run, its volume is mounted "
                                "read-only: /tmp/disc/a\n"),
                      HasSubstr("velathumb-queue: deferred to a later run, its volume is mounted "
                                "read-only: R:/tmp/disc/tree\n")));
  }
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  ExpectRun({"/tmp/a", "/tmp/disc/a", "R:/tmp/disc/tree"});
}

/// A file system can also be made read-only because of an error.
TEST_F(LaterTest, AVolumeThatBecomesReadOnlyIsDeferred) {
  velathumb_.Stub().PlanCall(1, StubPlan().CreateFile("/tmp/here").WaitForFile("/tmp/go"));
  Enqueue({"/tmp/disc"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  {
    const ReadOnlyMount disc("/tmp/disc");
    Release();
    ExpectEnd(runner, 1);
    ExpectDeferred({"/tmp/disc"});
  }
  ExpectRun({"/tmp/disc", "/tmp/disc"});
}

TEST_F(LaterTest, OfATreeOnlyThePartsThatAreReadOnlyAreDeferred) {
  for (const char* directory : {"/tmp/t/a/below", "/tmp/t/b:c/below", "/tmp/t/d"}) {
    MakeDirectories(directory);
  }
  Enqueue({"R:/tmp/t"});
  {
    const ReadOnlyMount a("/tmp/t/a");
    const ReadOnlyMount b("/tmp/t/b:c");
    EXPECT_EQ(velathumb_.Run().exitCode, 1);
  }
  const std::string later = ReadFile(kLaterFile);
  EXPECT_THAT(later, AnyOf(Lines({"R:/tmp/t/a", "/tmp/t/b:c", "/tmp/t/b:c/below"}),
                           Lines({"/tmp/t/b:c", "/tmp/t/b:c/below", "R:/tmp/t/a"})));
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(),
              UnorderedElementsAre("R:/tmp/t", "R:/tmp/t/a", "/tmp/t/b:c", "/tmp/t/b:c/below"));
  ExpectQueueDone();
}

TEST_F(LaterTest, ATreeWithAReadOnlyPartThatCannotBeAnEntryIsDeferredAsAWhole) {
  MakeDirectories("/tmp/t/a\nb");
  Enqueue({"R:/tmp/t"});
  {
    const ReadOnlyMount part("/tmp/t/a\nb");
    ExpectRunDefers({"R:/tmp/t"});
  }
  ExpectRun({"R:/tmp/t", "R:/tmp/t"});
}

/// Takes a minute: the pauses between the tries become longer and longer.
TEST_F(LaterTest, AnEntryWhoseVelathumbIsKilledEachTimeIsDeferred) {
  velathumb_.Stub().PlanWhen("/tmp/a", StubPlan().DieBySignal(SIGKILL));
  Enqueue({"/tmp/a", "/tmp/b"});
  EXPECT_THAT(
      ExpectRunDefers({"/tmp/a"}),
      HasSubstr("deferred to a later run, velathumb did not complete in any try: /tmp/a\n"));
  const std::vector<std::string> entries = velathumb_.Entries();
  EXPECT_EQ(std::count(entries.begin(), entries.end(), "/tmp/a"), 25);
  EXPECT_EQ(std::count(entries.begin(), entries.end(), "/tmp/b"), 1);
}

TEST_F(LaterTest, DeferredEntriesDoNotDelayAFollowingRunner) {
  AppendToQueue({"/tmp/none"});
  Program runner = velathumb_.Start({"--follow"});
  ASSERT_TRUE(WaitUntilExists(kLaterFile));
  Enqueue({"/tmp/a"});
  EXPECT_TRUE(velathumb_.WaitForStarts(1));
  EXPECT_TRUE(WaitUntilGone(kTakenFile));
  Stop(runner);
  ExpectDeferred({"/tmp/none"});
}

TEST_F(LaterTest, AnEntryThatCannotBeDeferredStaysTaken) {
  velathumb_.Stub().PlanCall(1, StubPlan().CreateFile(kLaterFile).ReplaceByDirectory(kLaterFile));
  Enqueue({"/tmp/a"});
  AppendToQueue({"/tmp/none"});
  EXPECT_EQ(velathumb_.Run().exitCode, 2);
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n/tmp/none\n");
  EXPECT_EQ(ReadFile(kJournalFile), "/tmp/a\n");
}

TEST_F(LaterTest, AProfileThatBecomesUnusableEndsAFollowingRunnerBeforeItTakes) {
  Program runner = velathumb_.Start({"--follow"});
  EXPECT_FALSE(runner.Wait(milliseconds(200)));
  WriteFile(kProfiles, "[thumb_s\n");
  Enqueue({"/tmp/a"});
  ExpectEnd(runner, 78);
  EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
  EXPECT_THAT(velathumb_.Entries(), IsEmpty());
}

TEST_F(LaterTest, ALineAddedToTheTakenFileIsProcessedInTheSameRun) {
  velathumb_.Stub().PlanCall(1, StubPlan().WriteFile(kTakenFile, "/tmp/a\n/tmp/late\n"));
  MakeEntryDirectories({"/tmp/late"});
  Enqueue({"/tmp/a"});
  ExpectRun({"/tmp/a", "/tmp/late"});
}

TEST_F(LaterTest, ASignalEndsTheWaitForALockedQueue) {
  Enqueue({"/tmp/a"});
  const Descriptor held = HoldLock(kQueueFile, O_RDWR | O_CREAT);
  Program runner = velathumb_.Start();
  EXPECT_FALSE(runner.Wait(milliseconds(500)));
  Stop(runner);
  EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
}

TEST_F(LaterTest, ALockedQueueIsTakenAfterwards) {
  Enqueue({"/tmp/a"});
  Descriptor held = HoldLock(kQueueFile, O_RDWR | O_CREAT);
  Program runner = velathumb_.Start();
  EXPECT_FALSE(runner.Wait(milliseconds(500)));
  held.Close();
  ExpectEnd(runner, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  ExpectQueueDone();
}

TEST_F(LaterTest, ASignalEndsTheWaitToPutDeferredEntriesBack) {
  WriteFile(kLaterFile, "/tmp/a\n");
  const Descriptor held = HoldLock(kQueueFile, O_RDWR | O_CREAT);
  Program runner = velathumb_.Start();
  EXPECT_FALSE(runner.Wait(milliseconds(500)));
  Stop(runner);
  EXPECT_EQ(ReadFile(kLaterFile), "/tmp/a\n");
}

TEST_F(LaterTest, WaitsQuietlyForALockedTakenFile) {
  Program runner = StartAndHold({"/tmp/a"});
  Descriptor held = HoldLock(kTakenFile, O_RDWR | O_CREAT);
  Release();
  EXPECT_FALSE(runner.Wait(milliseconds(1000)));
  held.Close();
  ExpectEnd(runner, 0);
  const std::string log = runner.Error();
  EXPECT_LT(std::count(log.begin(), log.end(), '\n'), 10) << log.substr(0, 2000);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  ExpectQueueDone();
}

}  // namespace
}  // namespace vela_test
