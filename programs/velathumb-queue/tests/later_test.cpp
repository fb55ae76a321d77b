// Entries that cannot be worked on now, and files of the queue that somebody holds.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>

#include <algorithm>
#include <chrono>
#include <string>
#include <vector>

#include "queue_fixture.h"
#include "support/descriptor.h"
#include "support/files.h"
#include "support/mounts.h"

namespace vela_test {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

constexpr uint64_t kGibibyte = uint64_t{1} << 30;

Descriptor HoldLock(const char* file) {
  Descriptor held(open(file, O_RDWR | O_CREAT | O_CLOEXEC, 0644));
  EXPECT_EQ(flock(held.Get(), LOCK_EX), 0);
  return held;
}

class LaterTest : public QueueTest {
 protected:
  static void ExpectEnd(Program& runner, int exitCode) {
    const auto result = runner.Wait(seconds(10));
    ASSERT_TRUE(result);
    EXPECT_EQ(result->exitCode, exitCode) << result->err;
  }

  /// Nothing waits but these entries, which are kept.
  static void ExpectKept(const std::vector<std::string>& entries) {
    EXPECT_EQ(ReadFile(kLaterFile), Lines(entries));
    for (const char* file : {kQueueFile, kTakenFile, kJournalFile}) {
      EXPECT_FALSE(Exists(file)) << file;
    }
  }

  RecordingVelathumb velathumb_;
};

TEST_F(LaterTest, ADirectoryThatIsNotThereIsKeptUntilItIs) {
  AppendToQueue({"/tmp/none", "R:/tmp/gone"});
  Enqueue({"/tmp/a"});
  const ProgramResult first = velathumb_.Run();
  EXPECT_EQ(first.exitCode, 1);
  EXPECT_THAT(first.err,
              HasSubstr("deferred to a later run, there is no such directory: R:/tmp/gone\n"));
  ExpectKept({"/tmp/none", "R:/tmp/gone"});
  MakeDirectories("/tmp/gone");
  EXPECT_EQ(velathumb_.Run().exitCode, 1);
  ExpectKept({"/tmp/none"});
  MakeDirectories("/tmp/none");
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "R:/tmp/gone", "/tmp/none"));
  ExpectNothingWaits();
}

TEST_F(LaterTest, ADirectoryThatGoesWhileItIsWorkedOnIsKept) {
  velathumb_.Stub().PlanCall(1, StubPlan().Remove("/tmp/a"));
  Enqueue({"/tmp/a"});
  EXPECT_EQ(velathumb_.Run().exitCode, 1);
  ExpectKept({"/tmp/a"});
}

TEST_F(LaterTest, ANearlyFullVolumeIsLeftAloneUntilItHasRoom) {
  SmallVolume volume("/tmp/small", 2 * kGibibyte);
  WriteFile("/tmp/small/file", "");
  volume.SetAvailable(kGibibyte - SmallVolume::PageSize());
  Enqueue({"/tmp/small", "/tmp/a"});
  const ProgramResult first = velathumb_.Run();
  EXPECT_EQ(first.exitCode, 1);
  EXPECT_THAT(first.err,
              HasSubstr("deferred to a later run, its volume is nearly full: /tmp/small\n"));
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  ExpectKept({"/tmp/small"});
  volume.SetAvailable(kGibibyte);
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/small"));
  ExpectNothingWaits();
}

TEST_F(LaterTest, AVolumeThatBecomesNearlyFullIsDoneAgain) {
  SmallVolume volume("/tmp/small", 2 * kGibibyte);
  WriteFile("/tmp/small/file", "x");
  velathumb_.Stub().PlanCall(1, StubPlan().FillVolume("/tmp/small"));
  Enqueue({"/tmp/small"});
  EXPECT_EQ(velathumb_.Run().exitCode, 1);
  ExpectKept({"/tmp/small"});
  volume.SetAvailable(2 * kGibibyte);
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/small", "/tmp/small"));
  ExpectNothingWaits();
}

/// Takes a minute: the pauses between the tries become longer and longer.
TEST_F(LaterTest, AnEntryWhoseVelathumbIsKilledEachTimeIsKept) {
  velathumb_.Stub().PlanWhen("/tmp/a", StubPlan().DieBySignal(SIGKILL));
  Enqueue({"/tmp/a", "/tmp/b"});
  const ProgramResult result = velathumb_.Run();
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err,
              HasSubstr("deferred to a later run, velathumb did not complete in any try: /tmp/a\n"));
  const std::vector<std::string> entries = velathumb_.Entries();
  EXPECT_EQ(std::count(entries.begin(), entries.end(), "/tmp/a"), 25);
  EXPECT_EQ(std::count(entries.begin(), entries.end(), "/tmp/b"), 1);
  ExpectKept({"/tmp/a"});
}

TEST_F(LaterTest, WhatIsKeptHoldsNothingBackForARunnerThatStays) {
  AppendToQueue({"/tmp/none"});
  Program runner = velathumb_.Start({"--follow"});
  ASSERT_TRUE(WaitUntilExists(kLaterFile));
  Enqueue({"/tmp/a"});
  EXPECT_TRUE(velathumb_.WaitForStarts(1));
  EXPECT_TRUE(WaitUntilGone(kTakenFile));
  runner.Kill(SIGTERM);
  ExpectEnd(runner, 1);
  ExpectKept({"/tmp/none"});
}

TEST_F(LaterTest, WhatCannotBeKeptStaysInHand) {
  velathumb_.Stub().PlanCall(1, StubPlan().CreateFile(kLaterFile).ReplaceByDirectory(kLaterFile));
  Enqueue({"/tmp/a"});
  AppendToQueue({"/tmp/none"});
  EXPECT_EQ(velathumb_.Run().exitCode, 2);
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n/tmp/none\n");
  EXPECT_EQ(ReadFile(kJournalFile), "/tmp/a\n");
}

TEST_F(LaterTest, AProfileThatBecomesUnusableEndsARunnerThatStaysBeforeItTakes) {
  Program runner = velathumb_.Start({"--follow"});
  EXPECT_FALSE(runner.Wait(milliseconds(200)));
  WriteFile(kProfiles, "[thumb_s\n");
  Enqueue({"/tmp/a"});
  ExpectEnd(runner, 2);
  EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
  EXPECT_THAT(velathumb_.Entries(), IsEmpty());
}

TEST_F(LaterTest, ALineThatIsWrittenIntoWhatWasTakenIsDoneInTheSameRun) {
  velathumb_.Stub().PlanCall(1, StubPlan().WriteFile(kTakenFile, "/tmp/a\n/tmp/late\n"));
  MakeEntryDirectories({"/tmp/late"});
  Enqueue({"/tmp/a"});
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/late"));
  ExpectNothingWaits();
}

TEST_F(LaterTest, ASignalIsHeardWhileSomebodyHoldsTheQueue) {
  Enqueue({"/tmp/a"});
  const Descriptor held = HoldLock(kQueueFile);
  Program runner = velathumb_.Start();
  EXPECT_FALSE(runner.Wait(milliseconds(500)));
  runner.Kill(SIGTERM);
  ExpectEnd(runner, 1);
  EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
}

TEST_F(LaterTest, AQueueThatSomebodyHoldsIsTakenAfterwards) {
  Enqueue({"/tmp/a"});
  Descriptor held = HoldLock(kQueueFile);
  Program runner = velathumb_.Start();
  EXPECT_FALSE(runner.Wait(milliseconds(500)));
  held.Close();
  ExpectEnd(runner, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  ExpectNothingWaits();
}

TEST_F(LaterTest, ASignalIsHeardWhileWhatWasKeptCannotBePutBack) {
  WriteFile(kLaterFile, "/tmp/a\n");
  const Descriptor held = HoldLock(kQueueFile);
  Program runner = velathumb_.Start();
  EXPECT_FALSE(runner.Wait(milliseconds(500)));
  runner.Kill(SIGTERM);
  EXPECT_TRUE(runner.Wait(seconds(5)));
  EXPECT_EQ(ReadFile(kLaterFile), "/tmp/a\n");
}

TEST_F(LaterTest, WhileSomebodyHoldsWhatIsDoneItWaitsQuietly) {
  velathumb_.Stub().PlanCall(1, StubPlan().WaitForFile("/tmp/go"));
  Enqueue({"/tmp/a"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(velathumb_.WaitForStarts(1));
  Descriptor held = HoldLock(kTakenFile);
  WriteFile("/tmp/go", "");
  EXPECT_FALSE(runner.Wait(milliseconds(1000)));
  held.Close();
  ExpectEnd(runner, 0);
  const std::string told = runner.Error();
  EXPECT_LT(std::count(told.begin(), told.end(), '\n'), 10) << told.substr(0, 2000);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  ExpectNothingWaits();
}

}  // namespace
}  // namespace vela_test
