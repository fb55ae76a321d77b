// Paused conversion.
#include "conversion_pause.h"

#include <signal.h>

#include <ctime>
#include <mutex>
#include <thread>

#include "platform/velaindex.h"
#include "progress/velamk_progress.h"
#include "queue_fixture.h"
#include "support/daemon_peer.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::seconds;

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
  /// Fails the test when velathumb is started within half a second.
  void ExpectNoStart() const {
    std::this_thread::sleep_for(std::chrono::milliseconds(500));
    EXPECT_THAT(velathumb_.Entries(), IsEmpty());
  }
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
  ExpectQueueDone();
}

TEST_F(PauseTest, AnEarlierResumeTimeIsNoticed) {
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
  Stop(runner);
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n");
}

TEST_F(PauseTest, NothingIsStartedWhileTheServiceHasDisabledConversion) {
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

TEST_F(PauseTest, ARunningVelathumbContinues) {
  DaemonPeer daemon;
  velathumb_.Stub().PlanCall(1, StubPlan().WaitForFile("/tmp/go").CreateFile("/tmp/came"));
  Enqueue({"/tmp/a", "/tmp/b"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(velathumb_.WaitForStarts(1));
  daemon.Answer(kSwitch, SwitchedOff(true));
  // The answer that conversion is enabled is valid for a second, and longer when it came slowly.
  std::this_thread::sleep_for(std::chrono::milliseconds(2500));
  Release();
  EXPECT_TRUE(WaitUntilExists("/tmp/came"));
  std::this_thread::sleep_for(std::chrono::milliseconds(500));
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  EXPECT_EQ(ReadFile(kJournalFile), "/tmp/a\n");
  Stop(runner);
}

TEST_F(PauseTest, InvalidAnswersOfTheDaemonDoNotPauseConversion) {
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
    EXPECT_THAT(result.err, Not(HasSubstr("conversion is paused"))) << answer;
    EXPECT_THAT(velathumb.Entries(), ElementsAre("/tmp/a")) << answer;
  }
}

TEST_F(PauseTest, ASilentDaemonDoesNotKeepTheRunnerFromEnding) {
  DaemonPeer daemon;
  daemon.Answer(kSwitch, DaemonReply::Silence());
  velathumb_.Stub().Plan(StubPlan().WaitForFile("/tmp/never"));
  Enqueue({"/tmp/a"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(daemon.WaitForRequests(1));
  Stop(runner);
}

TEST_F(PauseTest, AnImmediateAnswerIsValidForASecond) {
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

TEST_F(PauseTest, ASlowAnswerIsValidForLonger) {
  DaemonPeer daemon;
  daemon.Answer(kSwitch, SwitchedOff(false).After(300));
  PauseGate gate;
  EXPECT_TRUE(gate.MayStart());
  std::this_thread::sleep_for(std::chrono::milliseconds(1500));
  EXPECT_TRUE(gate.MayStart());
  EXPECT_EQ(daemon.Requests().size(), 1U);
}

bool WaitForCounter(const char* key, int value) {
  for (int i = 0; i < 1000; ++i) {
    if (GetConvProgress(THUMB_TYPE_PHOTO, key) == value) {
      return true;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  return false;
}

TEST_F(PauseTest, TheTotalsAreSetWhileTheServiceHasDisabledConversion) {
  AddConvProgress(THUMB_TYPE_PHOTO, "total", 8);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed", 8);
  MakePhoto("/tmp/a/1.jpg");
  MakePhoto("/tmp/a/2.jpg");
  DaemonPeer daemon;
  daemon.Answer(kSwitch, SwitchedOff(true));
  Enqueue({"/tmp/a"});
  Program runner = velathumb_.Start();
  EXPECT_TRUE(WaitForCounter("total", 2));
  EXPECT_EQ(GetConvProgress(THUMB_TYPE_PHOTO, "completed"), 0);
  EXPECT_THAT(velathumb_.Entries(), IsEmpty());
  // Comes during the pause.
  MakePhoto("/tmp/a/3.jpg");
  daemon.Answer(kSwitch, SwitchedOff(false));
  ExpectEnd(runner, 0);
  EXPECT_EQ(GetConvProgress(THUMB_TYPE_PHOTO, "total"), 3);
  EXPECT_EQ(GetConvProgress(THUMB_TYPE_PHOTO, "completed"), 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
}

TEST_F(PauseTest, ARunnerThatIsStoppedBeforeItCountsKeepsTheTotals) {
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
