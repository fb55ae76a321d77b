// Children that are run to their end.
#include <fcntl.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "platform/forked_call.h"
#include "platform/velautils.h"
#include "platform/vlibc.h"
#include "support/files.h"
#include "support/sandbox.h"
#include "support/seccomp_fail.h"
#include "support/stub_tool.h"
#include "support/system_log.h"

namespace {

using platform_test::CountZombies;
using platform_test::RunForked;
using std::chrono::steady_clock;
using vela_test::StubPlan;
using vela_test::StubTool;
using VELAUtils::ProcessRunner;

constexpr const char* kTool = "/usr/vela/bin/run-tool";

class ProcessRunnerTest : public vela_test::SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    tool_ = std::make_unique<StubTool>(kTool);
    tool_->Plan(StubPlan());
  }

  void Plan(const StubPlan& plan) { tool_->Plan(plan); }

  vela_test::StubCall OnlyCall() {
    const auto calls = tool_->Calls();
    EXPECT_EQ(calls.size(), 1U);
    return calls.empty() ? vela_test::StubCall() : calls[0];
  }

  static int Run() { return ProcessRunner(kTool, kTool).run(true, false); }

  std::unique_ptr<StubTool> tool_;
};

TEST_F(ProcessRunnerTest, KeepsTheOrderOfItsArguments) {
  ProcessRunner runner(kTool, "zero", "1", "2", "3", "4", "5", "6", "7", "8");
  runner.addArguments("9", "10", "11", "12", "13", "14", "15", "16", "17");
  runner.addArguments("18");
  EXPECT_EQ(runner.run(true, false), 0);
  std::vector<std::string> expected = {"zero"};
  for (int i = 1; i <= 18; ++i) expected.push_back(std::to_string(i));
  EXPECT_EQ(OnlyCall().arguments, expected);
}

TEST_F(ProcessRunnerTest, EndsTheArgumentsOfACallAtItsFirstNull) {
  ProcessRunner runner(kTool, kTool, "a", nullptr, "b");
  runner.addArguments("c", nullptr, "d");
  runner.addArguments(nullptr, "e");
  runner.addArguments("f");
  EXPECT_EQ(runner.run(true, false), 0);
  EXPECT_EQ(OnlyCall().arguments, (std::vector<std::string>{kTool, "a", "c", "f"}));
}

TEST_F(ProcessRunnerTest, TakesEveryArgumentAsItIs) {
  ProcessRunner runner(kTool, kTool, "", " ", "*", "$HOME", "a'b\"c\\", "\xff\n\t", "-", "(");
  EXPECT_EQ(runner.run(true, false), 0);
  EXPECT_EQ(OnlyCall().Parameters(),
            (std::vector<std::string>{"", " ", "*", "$HOME", "a'b\"c\\", "\xff\n\t", "-", "("}));
}

TEST_F(ProcessRunnerTest, TakesManyLongArguments) {
  ProcessRunner runner(kTool, kTool);
  for (int i = 0; i < 500; ++i) runner.addArguments(std::string(4000, 'a').c_str());
  EXPECT_EQ(runner.run(true, false), 0);
  EXPECT_EQ(OnlyCall().arguments.size(), 501U);
}

TEST_F(ProcessRunnerTest, CopiesWhatItIsGiven) {
  std::string argument = "before";
  ProcessRunner runner(kTool, kTool, argument.c_str());
  argument = "after!";
  EXPECT_EQ(runner.run(true, false), 0);
  EXPECT_EQ(OnlyCall().Parameters(), std::vector<std::string>{"before"});
}

TEST_F(ProcessRunnerTest, CanRunAgain) {
  ProcessRunner runner(kTool, kTool, "x");
  EXPECT_EQ(runner.run(true, false), 0);
  EXPECT_EQ(runner.run(true, false), 0);
  EXPECT_EQ(tool_->Calls().size(), 2U);
}

TEST_F(ProcessRunnerTest, IsZeroForExitStatusZeroOnly) {
  EXPECT_EQ(Run(), 0);
  for (const int status : {1, 2, 127, 255}) {
    Plan(StubPlan().Exit(status));
    EXPECT_EQ(Run(), status);
  }
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(ProcessRunnerTest, IsNonZeroWhenASignalEndsTheChild) {
  for (const int number : {SIGTERM, SIGKILL, SIGSEGV}) {
    Plan(StubPlan().DieBySignal(number));
    EXPECT_EQ(Run(), 128 + number);
  }
}

TEST_F(ProcessRunnerTest, IsNonZeroForWhatCannotBeStarted) {
  EXPECT_NE(ProcessRunner("/usr/vela/bin/absent", "absent").run(true, false), 0);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_NE(ProcessRunner("/usr/vela", "x").run(true, false), 0);
  EXPECT_NE(ProcessRunner("", "x").run(true, false), 0);
  EXPECT_NE(ProcessRunner(nullptr, nullptr).run(true, false), 0);
  EXPECT_NE(ProcessRunner("/usr/vela/bin/absent", "absent").run(false, false), 0);
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(ProcessRunnerTest, WaitsForTheEnd) {
  Plan(StubPlan().Sleep(200).CreateFile("/tmp/end-reached"));
  EXPECT_EQ(Run(), 0);
  EXPECT_TRUE(vela_test::Exists("/tmp/end-reached"));
}

TEST_F(ProcessRunnerTest, IsAProcessNamedAfterTheTool) {
  Plan(StubPlan().CreateFile("/tmp/running").Sleep(60000));
  const pid_t caller = platform_test::Fork([] { return Run(); });
  ASSERT_TRUE(vela_test::WaitUntilExists("/tmp/running"));
  const std::string process = "/proc/" + std::to_string(OnlyCall().pid);
  EXPECT_EQ(vela_test::ReadFile(process + "/comm"), "run-tool\n");
  EXPECT_EQ(VLIBCKill("run-tool", 0), 1);
  EXPECT_EQ(platform_test::Join(caller), 128 + SIGTERM);
}

TEST_F(ProcessRunnerTest, SendsTheOutputNowhere) {
  Plan(StubPlan().Print("output").PrintError("error"));
  EXPECT_EQ(Run(), 0);
  const auto descriptors = OnlyCall().descriptors;
  ASSERT_EQ(descriptors.size(), 3U);
  for (const auto& descriptor : descriptors) EXPECT_EQ(descriptor.target, "/dev/null");
}

TEST_F(ProcessRunnerTest, KeepsTheOutputOnDemand) {
  Plan(StubPlan().Print("output ").PrintError("error "));
  const int result = RunForked([] {
    const int file = open("/tmp/output", O_WRONLY | O_CREAT | O_APPEND, 0644);
    dup2(file, 1);
    dup2(file, 2);
    return ProcessRunner(kTool, kTool).run(true, true);
  });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(vela_test::ReadFile("/tmp/output"), "output error ");
  EXPECT_EQ(OnlyCall().descriptors.size(), 3U);
}

TEST_F(ProcessRunnerTest, KeepsAnOutputThatIsClosedAwayFromOtherFiles) {
  Plan(StubPlan().Print("output"));
  const int result = RunForked([] {
    for (int fd = 0; fd < 3; ++fd) close(fd);
    return ProcessRunner(kTool, kTool).run(true, true);
  });
  EXPECT_EQ(result, 0);
  for (const auto& descriptor : OnlyCall().descriptors) {
    EXPECT_EQ(descriptor.target, "/dev/null");
  }
}

TEST_F(ProcessRunnerTest, LetsNoDescriptorOfTheProgramThrough) {
  const int plain = open("/dev/zero", O_RDONLY);
  const int far = fcntl(plain, F_DUPFD, 900);
  EXPECT_EQ(Run(), 0);
  close(plain);
  close(far);
  EXPECT_EQ(OnlyCall().descriptors.size(), 3U);
}

TEST_F(ProcessRunnerTest, StartsWithDefaultSignals) {
  const int result = RunForked([] {
    signal(SIGPIPE, SIG_IGN);
    signal(SIGHUP, SIG_IGN);
    sigset_t all;
    sigfillset(&all);
    sigprocmask(SIG_SETMASK, &all, nullptr);
    return Run();
  });
  EXPECT_EQ(result, 0);
  EXPECT_TRUE(OnlyCall().ignoredSignals.empty());
  EXPECT_TRUE(OnlyCall().blockedSignals.empty());
}

TEST_F(ProcessRunnerTest, KnowsTheStatusInACallerThatIgnoresSigchld) {
  Plan(StubPlan().Exit(9));
  const int result = RunForked([] {
    signal(SIGCHLD, SIG_IGN);
    if (Run() != 9) return 1;
    struct sigaction now;
    sigaction(SIGCHLD, nullptr, &now);
    return now.sa_handler == SIG_IGN ? 0 : 2;
  });
  EXPECT_EQ(result, 0);
}

TEST_F(ProcessRunnerTest, WaitsAcrossInterruptions) {
  Plan(StubPlan().Sleep(300).Exit(4));
  const int result = RunForked([] {
    struct sigaction action;
    memset(&action, 0, sizeof(action));
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, nullptr);
    const itimerval often = {{0, 2000}, {0, 2000}};
    setitimer(ITIMER_REAL, &often, nullptr);
    return Run();
  });
  EXPECT_EQ(result, 4);
}

TEST_F(ProcessRunnerTest, EndsTheChildWithACallerThatIsKilled) {
  Plan(StubPlan().CreateFile("/tmp/running").Sleep(60000));
  const pid_t caller = platform_test::Fork([] { return Run(); });
  ASSERT_TRUE(vela_test::WaitUntilExists("/tmp/running"));
  const pid_t tool = OnlyCall().pid;
  ASSERT_EQ(kill(caller, SIGKILL), 0);
  platform_test::Join(caller);
  for (int i = 0; i < 500 && kill(tool, 0) == 0; ++i) usleep(10000);
  EXPECT_EQ(kill(tool, 0), -1);
}

TEST_F(ProcessRunnerTest, DoesNotWaitOnDemand) {
  Plan(StubPlan().WaitForFile("/tmp/go").CreateFile("/tmp/end-reached"));
  EXPECT_EQ(ProcessRunner(kTool, kTool).run(false, false), 0);
  EXPECT_FALSE(vela_test::Exists("/tmp/end-reached"));
  vela_test::WriteFile("/tmp/go", "");
  EXPECT_TRUE(vela_test::WaitUntilExists("/tmp/end-reached"));
  for (int i = 0; i < 200 && CountZombies() != 0; ++i) usleep(10000);
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(ProcessRunnerTest, LeavesNoDescriptorOpen) {
  const int before = platform_test::CountDescriptors();
  for (int i = 0; i < 5; ++i) {
    Run();
    ProcessRunner("/usr/vela/bin/absent", "x").run(true, false);
  }
  EXPECT_EQ(platform_test::CountDescriptors(), before);
}

/// Ends the tools as the program's own handler does, then tells whether one was missed: status 40
/// when all of them are gone, 41 when one lives on.
void EndToolsAndTell(int) {
  VLIBCKill("run-tool", SIGKILL);
  constexpr timespec kPause = {0, 5000000};
  for (int i = 0; i < 600; ++i) {
    if (VLIBCKill("run-tool", SIGURG) == 0) _exit(40);  // a signal that does nothing
    nanosleep(&kPause, nullptr);
  }
  _exit(41);
}

TEST_F(ProcessRunnerTest, LetsNoHandlerMissAChildThatHasJustStarted) {
  Plan(StubPlan().Sleep(60000));
  for (int round = 0; round < 100; ++round) {
    const pid_t caller = platform_test::Fork([] {
      signal(SIGTERM, EndToolsAndTell);
      for (;;) Run();
      return 0;
    });
    usleep(static_cast<useconds_t>(200 + round * 29));
    kill(caller, SIGTERM);
    const int ended = platform_test::Join(caller);
    // Before the handler was set, the signal itself ends the process.
    ASSERT_TRUE(ended == 40 || ended == -SIGTERM) << ended << " in round " << round;
  }
}

class ProcessRunnerLimit : public ProcessRunnerTest {
 protected:
  void SetUp() override {
    ProcessRunnerTest::SetUp();
    vela_test::WriteFile("/etc/velainfo.conf", "tool_timeout=\"1\"\n");
    start_ = steady_clock::now();
  }

  double Seconds() const {
    return std::chrono::duration<double>(steady_clock::now() - start_).count();
  }

  steady_clock::time_point start_;
};

const char* const kLimitLine =
    "/usr/vela/bin/run-tool has not ended within 1 seconds (tool_timeout) and was killed";

TEST_F(ProcessRunnerLimit, KillsAChildThatRunsTooLong) {
  Plan(StubPlan().IgnoreSignal(SIGTERM).Sleep(60000));
  EXPECT_NE(Run(), 0);
  EXPECT_GE(Seconds(), 1.0);
  EXPECT_LT(Seconds(), 5.0);
  EXPECT_EQ(CountZombies(), 0);
  EXPECT_EQ(vela_test::ErrorLines(), std::vector<std::string>{kLimitLine});
}

TEST_F(ProcessRunnerLimit, HoldsWhereTheSystemHasNoWaitWithLimit) {
  Plan(StubPlan().IgnoreSignal(SIGTERM).Sleep(60000));
  const int result = RunForked([] {
    if (vela_test::SeccompFail({SYS_pidfd_open}, ENOSYS)() != 0) return 1;
    return Run() == 128 + SIGKILL ? 0 : 2;
  });
  EXPECT_EQ(result, 0);
  EXPECT_GE(Seconds(), 1.0);
  EXPECT_LT(Seconds(), 5.0);
  EXPECT_EQ(vela_test::ErrorLines(), std::vector<std::string>{kLimitLine});

  Plan(StubPlan().Sleep(50).Exit(6));
  EXPECT_EQ(RunForked([] {
              vela_test::SeccompFail({SYS_pidfd_open}, EPERM)();
              return Run();
            }),
            6);
}

TEST_F(ProcessRunnerLimit, DoesNotTouchAChildThatEndsInTime) {
  Plan(StubPlan().Sleep(300).Exit(3));
  EXPECT_EQ(Run(), 3);
  EXPECT_TRUE(vela_test::ErrorLines().empty());
}

TEST_F(ProcessRunnerLimit, HoldsForAChildThatNobodyWaitsFor) {
  Plan(StubPlan().CreateFile("/tmp/running").Sleep(60000));
  EXPECT_EQ(ProcessRunner(kTool, kTool).run(false, false), 0);
  ASSERT_TRUE(vela_test::WaitUntilExists("/tmp/running"));
  const pid_t tool = OnlyCall().pid;
  for (int i = 0; i < 500 && kill(tool, 0) == 0; ++i) usleep(10000);
  EXPECT_EQ(kill(tool, 0), -1);
  EXPECT_GE(Seconds(), 1.0);
}

TEST_F(ProcessRunnerLimit, IsNoneForZero) {
  vela_test::WriteFile("/etc/velainfo.conf", "tool_timeout=0\n");
  Plan(StubPlan().Sleep(1500));
  EXPECT_EQ(Run(), 0);
}

TEST_F(ProcessRunnerLimit, IsTheDefaultForAnUnreadableNumber) {
  for (const char* value : {"-1", "", "1.5"}) {
    vela_test::WriteFile("/etc/velainfo.conf", std::string("tool_timeout=\"") + value + "\"\n");
    Plan(StubPlan().Sleep(1200));
    EXPECT_EQ(Run(), 0) << value;
  }
}

TEST_F(ProcessRunnerLimit, IsVeryLongForAVeryLargeNumber) {
  vela_test::WriteFile("/etc/velainfo.conf", "tool_timeout=\"99999999999999999999\"\n");
  Plan(StubPlan().Sleep(100));
  EXPECT_EQ(Run(), 0);
}

}  // namespace
