// Conversion that is held back.
#include "conversion_pause.h"

#include <gmock/gmock.h>
#include <signal.h>

#include <chrono>
#include <ctime>
#include <mutex>
#include <string>
#include <thread>

#include "platform/velaindex.h"
#include "progress/velamk_progress.h"
#include "queue_fixture.h"
#include "support/daemon_peer.h"
#include "support/files.h"

using namespace vela;

namespace vela_test {
namespace {

using std::chrono::seconds;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

constexpr const char* kSettings = "/etc/velainfo.conf";
constexpr const char* kSwitch = "IS_DISABLE_CONVERT_PHOTO";

void SetResumeTime(const std::string& time) {
  WriteFile(kSettings, "thumb_conv_resume_time=\"" + time + "\"\n");
}

DaemonReply SwitchedOff(bool isOff) {
  return DaemonReply::Line(isOff ? R"({"success":true,"result":true})"
                                 : R"({"success":true,"result":false})");
}

class PauseTest : public QueueTest {
 protected:
  /// Lets half a second go by, in which nothing may be started.
  void ExpectNoStart() const {
    std::this_thread::sleep_for(std::chrono::milliseconds(500));
    EXPECT_THAT(velathumb_.Entries(), IsEmpty());
  }

  static void ExpectEnd(Program& runner, int exitCode) {
    const auto result = runner.Wait(seconds(10));
    ASSERT_TRUE(result);
    EXPECT_EQ(result->exitCode, exitCode);
  }

  RecordingVelathumb velathumb_;
};

TEST_F(PauseTest, NothingIsStartedBeforeTheResumeTime) {
  const time_t resume = time(nullptr) + 3;
  SetResumeTime(std::to_string(resume));
  Enqueue({"/tmp/a"});
  Program runner = velathumb_.Start();
  ExpectNoStart();
  EXPECT_THAT(runner.Error(), HasSubstr("conversion is paused: the resume time is not reached\n"));
  ASSERT_TRUE(velathumb_.WaitForStarts(1));
  EXPECT_GE(time(nullptr), resume);
  ExpectEnd(runner, 0);
  ExpectNothingWaits();
}

TEST_F(PauseTest, AResumeTimeThatIsBroughtForwardIsNoticed) {
  SetResumeTime(std::to_string(time(nullptr) + 3600));
  Enqueue({"/tmp/a"});
  Program runner = velathumb_.Start();
  ExpectNoStart();
  SetResumeTime("0");
  ExpectEnd(runner, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
}

TEST_F(PauseTest, ANegativeResumeTimeIsNeverReached) {
  SetResumeTime("-5");
  Enqueue({"/tmp/a"});
  Program runner = velathumb_.Start();
  ExpectNoStart();
  runner.Kill(SIGTERM);
  ExpectEnd(runner, 1);
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n");
}

TEST_F(PauseTest, NothingIsStartedWhileTheServiceHasItSwitchedOff) {
  DaemonPeer daemon;
  daemon.Answer(kSwitch, SwitchedOff(true));
  Enqueue({"/tmp/a"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(daemon.WaitForRequests(1));
  ExpectNoStart();
  EXPECT_THAT(runner.Error(), HasSubstr("the index service has switched photo conversion off"));
  daemon.Answer(kSwitch, SwitchedOff(false));
  ExpectEnd(runner, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
}

TEST_F(PauseTest, WhatRunsGoesOn) {
  DaemonPeer daemon;
  velathumb_.Stub().PlanCall(1, StubPlan().WaitForFile("/tmp/go").CreateFile("/tmp/came"));
  Enqueue({"/tmp/a", "/tmp/b"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(velathumb_.WaitForStarts(1));
  daemon.Answer(kSwitch, SwitchedOff(true));
  // The answer that it may run is good for a second.
  std::this_thread::sleep_for(std::chrono::milliseconds(1100));
  WriteFile("/tmp/go", "");
  EXPECT_TRUE(WaitUntilExists("/tmp/came"));
  std::this_thread::sleep_for(std::chrono::milliseconds(500));
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  EXPECT_EQ(ReadFile(kJournalFile), "/tmp/a\n");
  runner.Kill(SIGTERM);
  ExpectEnd(runner, 1);
}

TEST_F(PauseTest, ADaemonThatAnswersNonsenseHoldsNothingBack) {
  for (const char* answer :
       {"[]", R"({"success":[],"result":true})", R"({"success":true,"result":{"a":1}})",
        R"({"success":false,"result":true})", R"({"result":true})", R"({"success":true})"}) {
    ResetQueueSandbox();
    const RecordingVelathumb velathumb;
    DaemonPeer daemon;
    daemon.Answer(kSwitch, DaemonReply::Line(answer));
    Enqueue({"/tmp/a"});
    const ProgramResult result = velathumb.Run();
    EXPECT_EQ(result.exitCode, 0) << answer;
    EXPECT_THAT(result.err, Not(HasSubstr("waiting"))) << answer;
    EXPECT_THAT(velathumb.Entries(), ElementsAre("/tmp/a")) << answer;
  }
}

TEST_F(PauseTest, ADaemonThatKeepsStillDoesNotKeepTheRunnerFromEnding) {
  DaemonPeer daemon;
  daemon.Answer(kSwitch, DaemonReply::Silence());
  velathumb_.Stub().Plan(StubPlan().WaitForFile("/tmp/never"));
  Enqueue({"/tmp/a"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(daemon.WaitForRequests(1));
  runner.Kill(SIGTERM);
  ExpectEnd(runner, 1);
}

TEST_F(PauseTest, AnAnswerThatCameAtOnceIsGoodForASecond) {
  DaemonPeer daemon;
  daemon.Answer(kSwitch, SwitchedOff(false));
  PauseGate gate;
  EXPECT_TRUE(gate.MayStart());
  EXPECT_TRUE(gate.MayStart());
  EXPECT_EQ(daemon.Requests().size(), 1U);
  std::this_thread::sleep_for(std::chrono::milliseconds(1500));
  EXPECT_TRUE(gate.MayStart());
  EXPECT_EQ(daemon.Requests().size(), 2U);
}

TEST_F(PauseTest, AnAnswerThatTookLongIsGoodForLonger) {
  DaemonPeer daemon;
  daemon.Answer(kSwitch, SwitchedOff(false).After(300));
  PauseGate gate;
  EXPECT_TRUE(gate.MayStart());
  std::this_thread::sleep_for(std::chrono::milliseconds(1500));
  EXPECT_TRUE(gate.MayStart());
  EXPECT_EQ(daemon.Requests().size(), 1U);
}

TEST_F(PauseTest, ARunnerThatIsStoppedBeforeItCountsLeavesTheTotals) {
  AddConvProgress(THUMB_TYPE_PHOTO, "total", 1000);
  Enqueue({"/tmp/a"});
  pid_t runnerProcess = 0;
  std::mutex isStarted;
  isStarted.lock();
  DaemonPeer daemon;
  daemon.Answer(kSwitch, SwitchedOff(false).Meanwhile([&](const DaemonRequest&) {
    const std::lock_guard<std::mutex> wait(isStarted);
    kill(runnerProcess, SIGTERM);
  }));
  Program runner = velathumb_.Start();
  runnerProcess = runner.Pid();
  isStarted.unlock();
  ExpectEnd(runner, 1);
  EXPECT_THAT(velathumb_.Entries(), IsEmpty());
  EXPECT_EQ(GetConvProgress(THUMB_TYPE_PHOTO, "total"), 1000);
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n");
}

}  // namespace
}  // namespace vela_test
