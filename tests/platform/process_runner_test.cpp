// Children that the caller waits for, and others.
#include <sys/syscall.h>

#include "platform/tool_fixture.h"
#include "platform/velautils.h"

namespace vela_test {
namespace {

using VELAUtils::ProcessRunner;

class ProcessRunnerTest : public ToolTest {
 protected:
  static int Run(bool keepsOutput = false) {
    return ProcessRunner(kTool, kTool).run(true, keepsOutput);
  }
};

TEST_F(ProcessRunnerTest, KeepsTheOrderOfItsArguments) {
  ProcessRunner runner(kTool, "zero", "1", "2", "3", "4", "5", "6", "7", "8");
  runner.addArguments("9", "10", "11", "12", "13", "14", "15", "16", "17");
  runner.addArguments("18");
  EXPECT_EQ(runner.run(true, false), 0);
  Strings expected = {"zero"};
  for (int i = 1; i <= 18; ++i) expected.push_back(std::to_string(i));
  EXPECT_EQ(OnlyCall().arguments, expected);
}

TEST_F(ProcessRunnerTest, EndsTheArgumentsOfACallAtItsFirstNull) {
  ProcessRunner runner(kTool, kTool, "a", nullptr, "b");
  runner.addArguments("c", nullptr, "d");
  runner.addArguments(nullptr, "e");
  runner.addArguments("f");
  EXPECT_EQ(runner.run(true, false), 0);
  EXPECT_EQ(OnlyCall().arguments, (Strings{kTool, "a", "c", "f"}));
}

TEST_F(ProcessRunnerTest, PassesArgumentsUnchanged) {
  ProcessRunner runner(kTool, kTool, "", " ", "*", "$HOME", "a'b\"c\\", "\xff\n\t", "-", "(");
  EXPECT_EQ(runner.run(true, false), 0);
  EXPECT_EQ(OnlyCall().Parameters(),
            (Strings{"", " ", "*", "$HOME", "a'b\"c\\", "\xff\n\t", "-", "("}));
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
  EXPECT_EQ(OnlyCall().Parameters(), Strings{"before"});
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

TEST_F(ProcessRunnerTest, IsNonZeroWhenTheProgramCannotBeStarted) {
  EXPECT_NE(ProcessRunner(kAbsentTool, "absent").run(true, false), 0);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_NE(ProcessRunner("/usr/vela", "x").run(true, false), 0);
  EXPECT_NE(ProcessRunner("", "x").run(true, false), 0);
  EXPECT_NE(ProcessRunner(nullptr, nullptr).run(true, false), 0);
  EXPECT_NE(ProcessRunner(kAbsentTool, "absent").run(false, false), 0);
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(ProcessRunnerTest, WaitsForTheEnd) {
  Plan(StubPlan().Sleep(200).CreateFile("/tmp/end-reached"));
  EXPECT_EQ(Run(), 0);
  EXPECT_TRUE(Exists("/tmp/end-reached"));
}

TEST_F(ProcessRunnerTest, IsAProcessNamedAfterTheTool) {
  Plan(StubPlan().CreateFile("/tmp/running").Sleep(60000));
  const pid_t caller = Fork([] { return Run(); });
  ASSERT_TRUE(WaitUntilExists("/tmp/running"));
  const std::string process = "/proc/" + std::to_string(OnlyCall().pid);
  EXPECT_EQ(ReadFile(process + "/comm"), "some-tool\n");
  EXPECT_EQ(VLIBCKill(kToolName, 0), 1);
  EXPECT_EQ(Join(caller), 128 + SIGTERM);
}

TEST_F(ProcessRunnerTest, DiscardsTheOutput) {
  Plan(StubPlan().Print("output").PrintError("error"));
  EXPECT_EQ(Run(), 0);
  const auto descriptors = OnlyCall().descriptors;
  ASSERT_EQ(descriptors.size(), 3U);
  for (const auto& descriptor : descriptors) EXPECT_EQ(descriptor.target, "/dev/null");
}

TEST_F(ProcessRunnerTest, KeepsTheOutputOnRequest) {
  Plan(StubPlan().Print("output ").PrintError("error "));
  const int result = RunForked([] {
    const int file = open("/tmp/output", O_WRONLY | O_CREAT | O_APPEND, 0644);
    dup2(file, 1);
    dup2(file, 2);
    return Run(true);
  });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(ReadFile("/tmp/output"), "output error ");
  EXPECT_EQ(OnlyCall().descriptors.size(), 3U);
}

TEST_F(ProcessRunnerTest, KeepsAnOutputThatIsClosedAwayFromOtherFiles) {
  Plan(StubPlan().Print("output"));
  const int result = RunForked([] {
    for (int fd = 0; fd < 3; ++fd) close(fd);
    return Run(true);
  });
  EXPECT_EQ(result, 0);
  for (const auto& descriptor : OnlyCall().descriptors) {
    EXPECT_EQ(descriptor.target, "/dev/null");
  }
}

TEST_F(ProcessRunnerTest, InheritsNoDescriptorOfTheProgram) {
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
  ExpectDefaultSignals();
}

TEST_F(ProcessRunnerTest, KnowsTheStatusInACallerThatIgnoresSigchld) {
  Plan(StubPlan().Exit(9));
  InOwnProcess([] {
    signal(SIGCHLD, SIG_IGN);
    EXPECT_EQ(Run(), 9);
    struct sigaction now;
    sigaction(SIGCHLD, nullptr, &now);
    EXPECT_EQ(now.sa_handler, SIG_IGN);
  });
}

TEST_F(ProcessRunnerTest, WaitsAcrossInterruptions) {
  Plan(StubPlan().Sleep(300).Exit(4));
  EXPECT_EQ(RunInterrupted([] { return Run(); }), 4);
}

TEST_F(ProcessRunnerTest, EndsTheChildWithACallerThatIsKilled) {
  ExpectEndWithKilledCaller([] { return Run(); });
}

TEST_F(ProcessRunnerTest, DoesNotWaitOnRequest) {
  Plan(StubPlan().WaitForFile("/tmp/go").CreateFile("/tmp/end-reached"));
  EXPECT_EQ(ProcessRunner(kTool, kTool).run(false, false), 0);
  EXPECT_FALSE(Exists("/tmp/end-reached"));
  WriteFile("/tmp/go", "");
  EXPECT_TRUE(WaitUntilExists("/tmp/end-reached"));
  EXPECT_TRUE(WaitUntil([] { return CountZombies() == 0; }));
}

TEST_F(ProcessRunnerTest, LeavesNoDescriptorOpen) {
  ExpectNoDescriptorLeak([] {
    for (int i = 0; i < 5; ++i) {
      Run();
      ProcessRunner(kAbsentTool, "x").run(true, false);
    }
  });
}

/// Terminates the tools like the program's own handler. Exits with status 40 when all of them have
/// ended, 41 when one was missed and is still running.
void EndTools(int) {
  VLIBCKill("some-tool", SIGKILL);
  constexpr timespec kPause = {0, 5000000};
  for (int i = 0; i < 600; ++i) {
    if (VLIBCKill("some-tool", SIGURG) == 0) _exit(40);  // a signal that has no effect
    nanosleep(&kPause, nullptr);
  }
  _exit(41);
}

TEST_F(ProcessRunnerTest, LetsNoHandlerMissAChildThatHasJustStarted) {
  Plan(StubPlan().Sleep(60000));
  for (int round = 0; round < 100; ++round) {
    const pid_t caller = Fork([] {
      signal(SIGTERM, EndTools);
      for (;;) Run();
      return 0;
    });
    usleep(static_cast<useconds_t>(200 + round * 29));
    kill(caller, SIGTERM);
    const int ended = Join(caller);
    // Before the handler was set, the signal itself ends the process.
    ASSERT_TRUE(ended == 40 || ended == -SIGTERM) << ended << " in round " << round;
  }
}

class ProcessRunnerLimit : public LimitedToolTest {
 protected:
  static int Run() { return ProcessRunner(kTool, kTool).run(true, false); }
};

TEST_F(ProcessRunnerLimit, KillsAChildThatRunsTooLong) {
  Plan(StubPlan().IgnoreSignal(SIGTERM).Sleep(60000));
  EXPECT_NE(Run(), 0);
  ExpectKilledAndReported();
}

TEST_F(ProcessRunnerLimit, HoldsWhereTheSystemHasNoWaitWithLimit) {
  Plan(StubPlan().IgnoreSignal(SIGTERM).Sleep(60000));
  InOwnProcess([] {
    ASSERT_EQ(SeccompFail({SYS_pidfd_open}, ENOSYS)(), 0);
    EXPECT_EQ(Run(), 128 + SIGKILL);
  });
  ExpectKilledAndReported();

  Plan(StubPlan().Sleep(50).Exit(6));
  InOwnProcess([] {
    SeccompFail({SYS_pidfd_open}, EPERM)();
    EXPECT_EQ(Run(), 6);
  });
}

TEST_F(ProcessRunnerLimit, DoesNotTouchAChildThatEndsInTime) {
  Plan(StubPlan().Sleep(300).Exit(3));
  EXPECT_EQ(Run(), 3);
  EXPECT_TRUE(ErrorLines().empty());
}

TEST_F(ProcessRunnerLimit, HoldsForAChildThatIsNotWaitedFor) {
  Plan(StubPlan().CreateFile("/tmp/running").Sleep(60000));
  EXPECT_EQ(ProcessRunner(kTool, kTool).run(false, false), 0);
  ASSERT_TRUE(WaitUntilExists("/tmp/running"));
  EXPECT_TRUE(WaitUntilEnded(OnlyCall().pid));
  EXPECT_GE(watch_.Seconds(), 1.0);
}

TEST_F(ProcessRunnerLimit, IsDisabledByZero) {
  SetLimit("0");
  Plan(StubPlan().Sleep(1500));
  EXPECT_EQ(Run(), 0);
}

TEST_F(ProcessRunnerLimit, IsTheDefaultForAnUnreadableNumber) {
  for (const char* value : {"\"-1\"", "\"\"", "\"1.5\""}) {
    SetLimit(value);
    Plan(StubPlan().Sleep(1200));
    EXPECT_EQ(Run(), 0) << value;
  }
}

TEST_F(ProcessRunnerLimit, IsVeryLongForAVeryLargeNumber) {
  SetLimit("\"99999999999999999999\"");
  Plan(StubPlan().Sleep(100));
  EXPECT_EQ(Run(), 0);
}

}  // namespace
}  // namespace vela_test
