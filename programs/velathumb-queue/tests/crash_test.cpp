// Ends that were not planned: no entry is lost, and none repeated but what was in hand.
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <map>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "queue_fixture.h"
#include "queue_program.h"
#include "support/files.h"
#include "support/stub_tool.h"

namespace vela_test {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;

std::vector<std::string> Directories(int count) {
  std::vector<std::string> directories;
  for (int i = 0; i < count; ++i) {
    directories.push_back("/tmp/d/" + std::to_string(i));
  }
  return directories;
}

class CrashTest : public QueueTest {
 protected:
  static void KillAndWait(Program& runner) {
    runner.Kill(SIGKILL);
    const auto result = runner.Wait(seconds(5));
    ASSERT_TRUE(result);
    EXPECT_EQ(result->signal, SIGKILL);
  }

  RecordingVelathumb velathumb_;
};

TEST_F(CrashTest, WhatWasInHandIsRepeatedAndNothingElse) {
  velathumb_.Stub().PlanCall(2, StubPlan().WaitForFile("/tmp/never"));
  Enqueue({"/tmp/a", "/tmp/b", "/tmp/c"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(velathumb_.WaitForStarts(2));
  KillAndWait(runner);
  EXPECT_TRUE(WaitUntilEnded(velathumb_.Stub().Calls()[1].pid));
  Enqueue({"/tmp/new"});
  const ProgramResult result = velathumb_.Run();
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.err, HasSubstr("resuming with 2 entries\n"));
  EXPECT_THAT(velathumb_.Entries(),
              ElementsAre("/tmp/a", "/tmp/b", "/tmp/b", "/tmp/c", "/tmp/new"));
  ExpectNothingWaits();
}

TEST_F(CrashTest, OfSeveralJobsThoseInHandAreRepeated) {
  velathumb_.Stub().PlanWhen("/tmp/b", StubPlan().WaitForFile("/tmp/go"));
  velathumb_.Stub().PlanWhen("/tmp/d", StubPlan().WaitForFile("/tmp/go"));
  Enqueue({"/tmp/a", "/tmp/b", "/tmp/c", "/tmp/d", "/tmp/e"});
  Program runner = velathumb_.Start({"--jobs", "2"});
  ASSERT_TRUE(velathumb_.WaitForStarts(4));
  KillAndWait(runner);
  WriteFile("/tmp/go", "");
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
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b"));
  ExpectNothingWaits();
}

TEST_F(CrashTest, AfterTheLastEndNothingIsRepeated) {
  WriteFile(kTakenFile, "/tmp/a\n/tmp/b\n");
  WriteFile(kJournalFile, "/tmp/b\n/tmp/a\n");
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), IsEmpty());
  ExpectNothingWaits();
}

TEST_F(CrashTest, BetweenTheRemovalsOfWhatIsDoneNothingIsLeftOut) {
  WriteFile(kJournalFile, "/tmp/a\n");
  Enqueue({"/tmp/a"});
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  ExpectNothingWaits();
}

TEST_F(CrashTest, AtAnyMomentNoEntryIsLostAndOneIsRepeatedForEachCrash) {
  constexpr int kEntries = 60;
  constexpr unsigned kSeed = 20261121;
  std::mt19937 random(kSeed);
  std::uniform_int_distribution<int> pause(1, 60);
  velathumb_.Stub().Plan(StubPlan().Sleep(5));
  Enqueue(Directories(kEntries));
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
  std::map<std::string, size_t> starts;
  for (const std::string& entry : velathumb_.Entries()) {
    ++starts[entry];
  }
  EXPECT_THAT(starts, SizeIs(kEntries));
  EXPECT_LE(velathumb_.Entries().size(), kEntries + crashes);
  ExpectNothingWaits();
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
  EXPECT_EQ(RunRunner().exitCode, 0);
  EXPECT_TRUE(HasThumb(photo));
  ExpectNothingWaits();
}

TEST_F(CrashTest, AVelathumbThatWasKilledIsTriedAgain) {
  velathumb_.Stub().PlanCall(1, StubPlan().DieBySignal(SIGKILL));
  velathumb_.Stub().PlanCall(2, StubPlan().Exit(1));
  Enqueue({"/tmp/a"});
  const ProgramResult result = velathumb_.Run();
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.err, HasSubstr("velathumb did not complete, trying again: /tmp/a\n"));
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/a", "/tmp/a"));
  ExpectNothingWaits();
}

TEST_F(CrashTest, WhileOneIsTriedAgainOthersGoOn) {
  velathumb_.Stub().PlanCall(1, StubPlan().DieBySignal(SIGKILL));
  Enqueue({"/tmp/a", "/tmp/b"});
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b", "/tmp/a"));
}

TEST_F(CrashTest, APhotoWhoseVelathumbWasKilledGetsItsThumbnail) {
  const StubTool converter(kConverterPath);
  converter.PlanCall(1, StubPlan().CreateFile("/tmp/here").WaitForFile("/tmp/go"));
  const std::string photo = MakePhoto("/tmp/p/a.jpg");
  Enqueue({"/tmp/p"});
  Program runner = StartRunner();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  kill(converter.Calls().at(0).parentPid, SIGKILL);
  const auto result = runner.Wait(seconds(20));
  ASSERT_TRUE(result);
  EXPECT_EQ(result->exitCode, 0);
  EXPECT_TRUE(HasThumb(photo));
  EXPECT_THAT(converter.Calls(), SizeIs(2));
}

TEST_F(CrashTest, AVelathumbThatCannotBeStartedLeavesTheQueue) {
  // Passes for a program by its mode only.
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
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b"));
}

/// SIGTERM, or SIGINT as from a terminal.
class StopTest : public CrashTest, public ::testing::WithParamInterface<int> {};

TEST_P(StopTest, EndsAllAndKeepsTheRest) {
  StubTool converter(kConverterPath);
  converter.PlanWhen("/tmp/p/b/2.jpg", StubPlan().CreateFile("/tmp/here").WaitForFile("/tmp/no"));
  const std::string done = MakePhoto("/tmp/p/a/1.jpg");
  const std::string inHand = MakePhoto("/tmp/p/b/2.jpg");
  const std::string rest = MakePhoto("/tmp/p/c/3.jpg");
  Enqueue({"/tmp/p/a", "/tmp/p/b", "/tmp/p/c"});
  Program runner = StartRunner();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  const StubCall conversion = converter.Calls().back();
  runner.Kill(GetParam());
  const auto result = runner.Wait(seconds(5));
  ASSERT_TRUE(result);
  EXPECT_EQ(result->exitCode, 1);
  EXPECT_TRUE(WaitUntilEnded(conversion.parentPid, 0));
  EXPECT_TRUE(WaitUntilEnded(conversion.pid, 2000));
  EXPECT_TRUE(HasThumb(done));
  EXPECT_FALSE(HasThumb(inHand));
  EXPECT_FALSE(HasThumb(rest));
  converter.PlanWhen("/tmp/p/b/2.jpg", StubPlan::Normal());
  EXPECT_EQ(RunRunner().exitCode, 0);
  EXPECT_TRUE(HasThumb(inHand));
  EXPECT_TRUE(HasThumb(rest));
  ExpectNothingWaits();
}

INSTANTIATE_TEST_SUITE_P(Signals, StopTest, ::testing::Values(SIGTERM, SIGINT),
                         [](const auto& test) { return test.param == SIGTERM ? "Term" : "Int"; });

}  // namespace
}  // namespace vela_test
