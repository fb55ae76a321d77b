// Crashes: no entry is lost, and only entries in progress are repeated.
#include <signal.h>
#include <sys/stat.h>

#include <random>
#include <set>
#include <thread>

#include "queue_fixture.h"

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::milliseconds;
using std::chrono::seconds;

class CrashTest : public QueueTest {
 protected:
  static void KillAndWait(Program& runner) {
    runner.Kill(SIGKILL);
    const auto result = runner.Wait(seconds(5));
    ASSERT_TRUE(result);
    EXPECT_EQ(result->signal, SIGKILL);
  }
};

TEST_F(CrashTest, OnlyTheEntryInProgressIsRepeated) {
  velathumb_.Stub().PlanCall(2, StubPlan().WaitForFile("/tmp/never"));
  Enqueue({"/tmp/a", "/tmp/b", "/tmp/c"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(velathumb_.WaitForStarts(2));
  KillAndWait(runner);
  EXPECT_TRUE(WaitUntilEnded(velathumb_.Stub().Calls()[1].pid));
  Enqueue({"/tmp/new"});
  EXPECT_THAT(ExpectRun({"/tmp/a", "/tmp/b", "/tmp/b", "/tmp/c", "/tmp/new"}),
              HasSubstr("resuming with 2 entries\n"));
}

TEST_F(CrashTest, OnlyTheEntriesOfRunningJobsAreRepeated) {
  velathumb_.Stub().PlanWhen("/tmp/b", StubPlan().WaitForFile("/tmp/go"));
  velathumb_.Stub().PlanWhen("/tmp/d", StubPlan().WaitForFile("/tmp/go"));
  Enqueue({"/tmp/a", "/tmp/b", "/tmp/c", "/tmp/d", "/tmp/e"});
  Program runner = velathumb_.Start({"--jobs", "2"});
  ASSERT_TRUE(velathumb_.WaitForStarts(4));
  KillAndWait(runner);
  Release();
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  const std::vector<std::string> entries = velathumb_.Entries();
  EXPECT_THAT(std::vector<std::string>(entries.begin(), entries.begin() + 4),
              UnorderedElementsAre("/tmp/a", "/tmp/b", "/tmp/c", "/tmp/d"));
  EXPECT_THAT(std::vector<std::string>(entries.begin() + 4, entries.end()),
              ElementsAre("/tmp/b", "/tmp/d", "/tmp/e"));
}

TEST_F(CrashTest, BeforeTheFirstStartNothingIsLost) {
  WriteFile("/etc/velainfo.conf", "thumb_conv_resume_time=\"-1\"\n");
  Enqueue({"/tmp/a", "/tmp/b"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(WaitUntilExists(kTakenFile));
  KillAndWait(runner);
  WriteFile("/etc/velainfo.conf", "");
  ExpectRun({"/tmp/a", "/tmp/b"});
}

TEST_F(CrashTest, AfterTheLastEndNothingIsRepeated) {
  WriteFile(kTakenFile, "/tmp/a\n/tmp/b\n");
  WriteFile(kJournalFile, "/tmp/b\n/tmp/a\n");
  ExpectRun({});
}

TEST_F(CrashTest, BetweenTheRemovalsOfTheFilesNothingIsSkipped) {
  WriteFile(kJournalFile, "/tmp/a\n");
  Enqueue({"/tmp/a"});
  ExpectRun({"/tmp/a"});
}

TEST_F(CrashTest, AtAnyTimeLosesNothingAndRepeatsOneEntry) {
  constexpr int kEntries = 60;
  constexpr unsigned kSeed = 20261121;
  std::mt19937 random(kSeed);
  std::uniform_int_distribution<int> pause(1, 60);
  velathumb_.Stub().Plan(StubPlan().Sleep(5));
  for (int i = 0; i < kEntries; ++i) {
    Enqueue({"/tmp/d/" + std::to_string(i)});
  }
  size_t crashes = 0;
  for (bool isOver = false; !isOver;) {
    Program runner = velathumb_.Start();
    std::this_thread::sleep_for(milliseconds(pause(random)));
    runner.Kill(SIGKILL);
    const auto result = runner.Wait(seconds(5));
    ASSERT_TRUE(result);
    isOver = result->signal == 0;
    crashes += isOver ? 0 : 1;
    EXPECT_TRUE(!isOver || result->exitCode == 0) << result->err;
  }
  EXPECT_GE(crashes, 5U) << "too fast to be hit";
  const std::vector<std::string> starts = velathumb_.Entries();
  EXPECT_THAT(std::set<std::string>(starts.begin(), starts.end()), SizeIs(kEntries));
  EXPECT_LE(starts.size(), kEntries + crashes);
  ExpectQueueDone();
}

TEST_F(CrashTest, VelathumbEndsWithItsRunner) {
  const StubTool converter(kConverterPath);
  converter.Plan(StubPlan().CreateFile("/tmp/here").WaitForFile("/tmp/never"));
  const std::string photo = MakePhoto("/tmp/p/a.jpg");
  Enqueue({"/tmp/p"});
  Program runner = StartRunner();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  const StubCall conversion = converter.Calls().at(0);
  KillAndWait(runner);
  EXPECT_TRUE(WaitUntilEnded(conversion.parentPid));
  EXPECT_TRUE(WaitUntilEnded(conversion.pid));
  converter.Plan(StubPlan::Normal());
  ConvertQueue();
  EXPECT_TRUE(HasThumb(photo));
}

TEST_F(CrashTest, AKilledVelathumbIsRetried) {
  velathumb_.Stub().PlanCall(1, StubPlan().DieBySignal(SIGKILL));
  velathumb_.Stub().PlanCall(2, StubPlan().Exit(1));
  Enqueue({"/tmp/a"});
  EXPECT_THAT(ExpectRun({"/tmp/a", "/tmp/a", "/tmp/a"}),
              HasSubstr("velathumb did not complete, trying again: /tmp/a\n"));
}

TEST_F(CrashTest, OthersContinueDuringARetry) {
  velathumb_.Stub().PlanCall(1, StubPlan().DieBySignal(SIGKILL));
  Enqueue({"/tmp/a", "/tmp/b"});
  ExpectRun({"/tmp/a", "/tmp/b", "/tmp/a"});
}

TEST_F(CrashTest, APhotoWhoseVelathumbWasKilledGetsItsThumbnail) {
  const StubTool converter(kConverterPath);
  converter.PlanCall(1, StubPlan().CreateFile("/tmp/here").WaitForFile("/tmp/go"));
  const std::string photo = MakePhoto("/tmp/p/a.jpg");
  Enqueue({"/tmp/p"});
  Program runner = StartRunner();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  kill(converter.Calls().at(0).parentPid, SIGKILL);
  ExpectEnd(runner, 0);
  EXPECT_TRUE(HasThumb(photo));
  EXPECT_THAT(converter.Calls(), SizeIs(2));
}

TEST_F(CrashTest, AVelathumbThatCannotBeStartedKeepsTheQueue) {
  // Executable by its mode, but not a program.
  const std::string broken = "/tmp/broken";
  WriteFile(broken, std::string("\x7f"
                                "ELF"));
  ASSERT_EQ(chmod(broken.c_str(), 0755), 0);
  Enqueue({"/tmp/a", "/tmp/b"});
  const ProgramResult result =
      RunProgram(QueueProgramPath(), {"--velathumb", broken, "--profile", kProfiles});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_THAT(result.err, HasSubstr("cannot start /tmp/broken: Exec format error\n"));
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n/tmp/b\n");
  ExpectRun({"/tmp/a", "/tmp/b"});
}

/// SIGTERM, or SIGINT as from a terminal.
class StopTest : public CrashTest, public WithParamInterface<int> {};

TEST_P(StopTest, EndsAllAndKeepsTheRest) {
  StubTool converter(kConverterPath);
  converter.PlanWhen("/tmp/p/b/2.jpg", StubPlan().CreateFile("/tmp/here").WaitForFile("/tmp/no"));
  const std::string done = MakePhoto("/tmp/p/a/1.jpg");
  const std::string inProgress = MakePhoto("/tmp/p/b/2.jpg");
  const std::string rest = MakePhoto("/tmp/p/c/3.jpg");
  Enqueue({"/tmp/p/a", "/tmp/p/b", "/tmp/p/c"});
  Program runner = StartRunner();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  const StubCall conversion = converter.Calls().back();
  runner.Kill(GetParam());
  ExpectEnd(runner, 1, seconds(5));
  EXPECT_TRUE(WaitUntilEnded(conversion.parentPid, 0));
  EXPECT_TRUE(WaitUntilEnded(conversion.pid, 2000));
  EXPECT_TRUE(HasThumb(done));
  EXPECT_FALSE(HasThumb(inProgress));
  EXPECT_FALSE(HasThumb(rest));
  converter.PlanWhen("/tmp/p/b/2.jpg", StubPlan::Normal());
  ConvertQueue();
  EXPECT_TRUE(HasThumb(inProgress));
  EXPECT_TRUE(HasThumb(rest));
}

INSTANTIATE_TEST_SUITE_P(Signals, StopTest, Values(SIGTERM, SIGINT),
                         [](const auto& test) { return test.param == SIGTERM ? "Term" : "Int"; });

}  // namespace
}  // namespace vela_test
