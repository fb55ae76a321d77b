// Children whose output is read through a stream.
#include <fcntl.h>
#include <sys/stat.h>
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

constexpr const char* kTool = "/usr/vela/bin/piped-tool";

/// Plain reads from the descriptor, as callers that copy large outputs do.
std::string ReadAll(FILE* stream) {
  std::string all;
  char buffer[4096];
  for (;;) {
    const ssize_t got = read(fileno(stream), buffer, sizeof(buffer));
    if (got <= 0) return all;
    all.append(buffer, static_cast<size_t>(got));
  }
}

double SecondsSince(steady_clock::time_point start) {
  return std::chrono::duration<double>(steady_clock::now() - start).count();
}

class PipedChild : public vela_test::SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    tool_ = std::make_unique<StubTool>(kTool);
  }

  void Plan(const StubPlan& plan) { tool_->Plan(plan); }

  vela_test::StubCall OnlyCall() {
    const auto calls = tool_->Calls();
    EXPECT_EQ(calls.size(), 1U);
    return calls.empty() ? vela_test::StubCall() : calls[0];
  }

  std::unique_ptr<StubTool> tool_;
};

TEST_F(PipedChild, GetsItsPathAndArgumentsUnchanged) {
  Plan(StubPlan());
  FILE* stream = VLIBCPopen(kTool, "r", "-v", "a b", "", "$(x)`y`;'\"\\*", "\xff\n", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(VLIBCPclose(stream), 0);
  EXPECT_EQ(OnlyCall().arguments,
            (std::vector<std::string>{kTool, "-v", "a b", "", "$(x)`y`;'\"\\*", "\xff\n"}));
}

TEST_F(PipedChild, GivesItsOutputThroughTheStream) {
  const std::string output = std::string("first\nsecond\n\0third", 19);
  Plan(StubPlan().Print(output));
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  char line[32];
  EXPECT_STREQ(fgets(line, sizeof(line), stream), "first\n");
  EXPECT_STREQ(fgets(line, sizeof(line), stream), "second\n");
  EXPECT_EQ(fread(line, 1, sizeof(line), stream), 6U);
  EXPECT_NE(feof(stream), 0);
  EXPECT_EQ(VLIBCPclose(stream), 0);
}

TEST_F(PipedChild, GivesLargeOutputsByPlainReads) {
  Plan(StubPlan().PrintRepeated(std::string(1000, 'x'), 5000));
  FILE* stream = VLIBCPopen(kTool, "rB", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(ReadAll(stream), std::string(5000000, 'x'));
  EXPECT_EQ(VLIBCPclose(stream), 0);
}

TEST_F(PipedChild, JoinsStandardErrorOnDemand) {
  Plan(StubPlan().PrintError("error ").Print("output"));
  for (const char* mode : {"rE", "rBE", "rEB"}) {
    FILE* stream = VLIBCPopen(kTool, mode, nullptr);
    ASSERT_NE(stream, nullptr);
    EXPECT_EQ(ReadAll(stream), "error output") << mode;
    EXPECT_EQ(VLIBCPclose(stream), 0);
  }
}

TEST_F(PipedChild, LosesStandardErrorOtherwise) {
  Plan(StubPlan().PrintErrorRepeated(std::string(1000, 'e'), 1000).Print("output"));
  for (const char* mode : {"r", "rB"}) {
    FILE* stream = VLIBCPopen(kTool, mode, nullptr);
    ASSERT_NE(stream, nullptr);
    EXPECT_EQ(ReadAll(stream), "output") << mode;
    EXPECT_EQ(VLIBCPclose(stream), 0);
  }
}

TEST_F(PipedChild, GivesItsExitStatus) {
  for (const int status : {0, 1, 7, 255}) {
    Plan(StubPlan().Exit(status));
    FILE* stream = VLIBCPopen(kTool, "r", nullptr);
    ASSERT_NE(stream, nullptr);
    EXPECT_EQ(VLIBCPclose(stream), status);
  }
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(PipedChild, GivesMinusOneWhenASignalEndsIt) {
  Plan(StubPlan().Print("half").DieBySignal(SIGSEGV));
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(ReadAll(stream), "half");
  EXPECT_EQ(VLIBCPclose(stream), -1);
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(PipedChild, IsNullForWhatCannotBeStarted) {
  EXPECT_EQ(VLIBCPopen("/usr/vela/bin/absent", "r", nullptr), nullptr);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(VLIBCPopen("/usr/vela", "r", nullptr), nullptr);
  EXPECT_EQ(VLIBCErrGet(), EACCES);
  vela_test::WriteFile("/tmp/text", "no program");
  ASSERT_EQ(chmod("/tmp/text", 0755), 0);
  EXPECT_EQ(VLIBCPopen("/tmp/text", "r", nullptr), nullptr) << "taken for a shell script";
  EXPECT_EQ(VLIBCErrGet(), ENOEXEC);
  EXPECT_EQ(VLIBCPopen("piped-tool", "r", nullptr), nullptr) << "searched for";
  EXPECT_EQ(VLIBCPopen("", "r", nullptr), nullptr);
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(PipedChild, IsNullForBadArguments) {
  EXPECT_EQ(VLIBCPopen(nullptr, "r", nullptr), nullptr);
  EXPECT_EQ(VLIBCPopen(kTool, nullptr, nullptr), nullptr);
  EXPECT_EQ(VLIBCPopen(kTool, "w", nullptr), nullptr);
  EXPECT_EQ(VLIBCPopen(kTool, "", nullptr), nullptr);
  EXPECT_TRUE(tool_->Calls().empty());
}

TEST_F(PipedChild, HasTheThreeStandardDescriptorsOnly) {
  vela_test::WriteFile("/tmp/inherited", "");
  const int plain = open("/tmp/inherited", O_RDONLY);
  const int high = fcntl(plain, F_DUPFD, 700);
  Plan(StubPlan());
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(VLIBCPclose(stream), 0);
  close(plain);
  close(high);
  const auto descriptors = OnlyCall().descriptors;
  ASSERT_EQ(descriptors.size(), 3U);
  EXPECT_EQ(descriptors[0].number, 0);
  EXPECT_EQ(descriptors[0].target, "/dev/null");
  EXPECT_EQ(descriptors[1].number, 1);
  EXPECT_EQ(descriptors[1].target.compare(0, 5, "pipe:"), 0) << descriptors[1].target;
  EXPECT_EQ(descriptors[2].number, 2);
  EXPECT_EQ(descriptors[2].target, "/dev/null");
}

TEST_F(PipedChild, HasThemAlsoWhenTheCallerHasNone) {
  Plan(StubPlan().PrintError("error ").Print("output"));
  const int result = RunForked([] {
    for (int fd = 0; fd < 3; ++fd) close(fd);
    FILE* stream = VLIBCPopen(kTool, "rE", nullptr);
    if (stream == nullptr) return 1;
    if (ReadAll(stream) != "error output") return 2;
    return VLIBCPclose(stream) == 0 ? 0 : 3;
  });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(OnlyCall().descriptors.size(), 3U);
}

TEST_F(PipedChild, HasDefaultSignalsAndNoneBlocked) {
  Plan(StubPlan());
  const int result = RunForked([] {
    for (int number = 1; number < SIGRTMAX; ++number) {
      if (number != SIGCHLD) signal(number, SIG_IGN);
    }
    sigset_t all;
    sigfillset(&all);
    sigprocmask(SIG_SETMASK, &all, nullptr);
    FILE* stream = VLIBCPopen(kTool, "r", nullptr);
    if (stream == nullptr || VLIBCPclose(stream) != 0) return 1;
    sigset_t now;
    sigprocmask(SIG_SETMASK, nullptr, &now);
    return sigismember(&now, SIGTERM) == 1 && sigismember(&now, SIGUSR1) == 1 ? 0 : 2;
  });
  EXPECT_EQ(result, 0);
  EXPECT_TRUE(OnlyCall().ignoredSignals.empty());
  EXPECT_TRUE(OnlyCall().blockedSignals.empty());
}

TEST_F(PipedChild, KeepsTheCallersSignalMaskAndHandlers) {
  Plan(StubPlan());
  sigset_t before;
  sigprocmask(SIG_SETMASK, nullptr, &before);
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  VLIBCPclose(stream);
  sigset_t after;
  sigprocmask(SIG_SETMASK, nullptr, &after);
  for (int number = 1; number < SIGRTMAX; ++number) {
    EXPECT_EQ(sigismember(&after, number), sigismember(&before, number)) << number;
  }
}

TEST_F(PipedChild, GivesItsStatusToACallerThatIgnoresSigchld) {
  Plan(StubPlan().Exit(9));
  const int result = RunForked([] {
    signal(SIGCHLD, SIG_IGN);
    for (int round = 0; round < 3; ++round) {
      FILE* stream = VLIBCPopen(kTool, "r", nullptr);
      if (stream == nullptr) return 1;
      if (VLIBCPclose(stream) != 9) return 2;
      struct sigaction now;
      sigaction(SIGCHLD, nullptr, &now);
      if (now.sa_handler != SIG_IGN) return 3;
    }
    return 0;
  });
  EXPECT_EQ(result, 0);
}

TEST_F(PipedChild, GivesItsStatusWhereTheSystemReapsChildren) {
  Plan(StubPlan().Exit(9));
  const int result = RunForked([] {
    struct sigaction action;
    memset(&action, 0, sizeof(action));
    action.sa_handler = SIG_DFL;
    action.sa_flags = SA_NOCLDWAIT;
    sigaction(SIGCHLD, &action, nullptr);
    FILE* stream = VLIBCPopen(kTool, "r", nullptr);
    if (stream == nullptr || VLIBCPclose(stream) != 9) return 1;
    sigaction(SIGCHLD, nullptr, &action);
    return (action.sa_flags & SA_NOCLDWAIT) != 0 ? 0 : 2;
  });
  EXPECT_EQ(result, 0);
}

TEST_F(PipedChild, IsWaitedForAcrossInterruptions) {
  Plan(StubPlan().Sleep(300).Exit(4));
  const int result = RunForked([] {
    struct sigaction action;
    memset(&action, 0, sizeof(action));
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, nullptr);
    const itimerval often = {{0, 2000}, {0, 2000}};
    setitimer(ITIMER_REAL, &often, nullptr);
    FILE* stream = VLIBCPopen(kTool, "r", nullptr);
    return stream != nullptr && VLIBCPclose(stream) == 4 ? 0 : 1;
  });
  EXPECT_EQ(result, 0);
}

TEST_F(PipedChild, EndsByTheClosedPipeWhenNobodyReadsOn) {
  Plan(StubPlan().PrintRepeated(std::string(1000, 'x'), 100000));
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  char line[16];
  ASSERT_NE(fgets(line, sizeof(line), stream), nullptr);
  EXPECT_EQ(VLIBCPclose(stream), -1) << "SIGPIPE";
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(PipedChild, IsWaitedForAlsoWhenItDoesNotCareAboutTheClosedPipe) {
  Plan(StubPlan()
           .IgnoreSignal(SIGPIPE)
           .PrintRepeated(std::string(1000, 'x'), 1000)
           .Sleep(200)
           .CreateFile("/tmp/end-reached")
           .Exit(5));
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(VLIBCPclose(stream), 5);
  EXPECT_TRUE(vela_test::Exists("/tmp/end-reached"));
}

TEST_F(PipedChild, IsWaitedForAfterItHasClosedItsOutput) {
  Plan(StubPlan().Print("all").CloseOutput().Sleep(200).CreateFile("/tmp/end-reached").Exit(6));
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(ReadAll(stream), "all");
  EXPECT_EQ(VLIBCPclose(stream), 6);
  EXPECT_TRUE(vela_test::Exists("/tmp/end-reached"));
}

TEST_F(PipedChild, KnowsItsOwnStreamsOnly) {
  EXPECT_EQ(VLIBCPclose(nullptr), -1);
  FILE* other = fopen("/dev/null", "r");
  EXPECT_EQ(VLIBCPclose(other), -1);
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
  EXPECT_EQ(fclose(other), 0) << "closed by the refused call";
}

TEST_F(PipedChild, CanBeOneOfSeveral) {
  tool_->PlanWhen("slow", StubPlan().Sleep(150).Print("slow").Exit(1));
  tool_->PlanWhen("fast", StubPlan().Print("fast").Exit(2));
  FILE* slow = VLIBCPopen(kTool, "r", "slow", nullptr);
  FILE* fast = VLIBCPopen(kTool, "r", "fast", nullptr);
  ASSERT_NE(slow, nullptr);
  ASSERT_NE(fast, nullptr);
  EXPECT_EQ(ReadAll(fast), "fast");
  EXPECT_EQ(VLIBCPclose(fast), 2);
  EXPECT_EQ(ReadAll(slow), "slow");
  EXPECT_EQ(VLIBCPclose(slow), 1);
}

TEST_F(PipedChild, DoesNotKeepTheStreamsOfOthersOpen) {
  tool_->PlanWhen("first", StubPlan().Print("first"));
  tool_->PlanWhen("second", StubPlan().WaitForFile("/tmp/go"));
  FILE* first = VLIBCPopen(kTool, "r", "first", nullptr);
  FILE* second = VLIBCPopen(kTool, "r", "second", nullptr);
  ASSERT_NE(first, nullptr);
  ASSERT_NE(second, nullptr);
  EXPECT_EQ(ReadAll(first), "first");  // would hang if the second child held the pipe
  EXPECT_EQ(VLIBCPclose(first), 0);
  vela_test::WriteFile("/tmp/go", "");
  EXPECT_EQ(VLIBCPclose(second), 0);
}

TEST_F(PipedChild, EndsWithACallerThatIsKilled) {
  Plan(StubPlan().CreateFile("/tmp/running").Sleep(60000));
  const pid_t caller = platform_test::Fork([] {
    FILE* stream = VLIBCPopen(kTool, "r", nullptr);
    return stream != nullptr ? VLIBCPclose(stream) : 100;
  });
  ASSERT_TRUE(vela_test::WaitUntilExists("/tmp/running"));
  const pid_t tool = OnlyCall().pid;
  ASSERT_EQ(kill(caller, SIGKILL), 0);
  EXPECT_EQ(platform_test::Join(caller), -SIGKILL);
  for (int i = 0; i < 500 && kill(tool, 0) == 0; ++i) usleep(10000);
  EXPECT_EQ(kill(tool, 0), -1);
}

TEST_F(PipedChild, HasItsCommandNameFromTheStart) {
  Plan(StubPlan().Sleep(60000));
  for (int round = 0; round < 200; ++round) {
    FILE* stream = VLIBCPopen(kTool, "r", nullptr);
    ASSERT_NE(stream, nullptr);
    ASSERT_EQ(VLIBCKill("piped-tool", SIGKILL), 1) << "round " << round;
    ASSERT_EQ(VLIBCPclose(stream), -1);
  }
}

TEST_F(PipedChild, IsNullWhenNoProcessCanBeHad) {
  const int result = RunForked([] {
    if (vela_test::SeccompFail(vela_test::ForkCalls(), EAGAIN)() != 0) return 1;
    if (VLIBCPopen(kTool, "r", nullptr) != nullptr) return 2;
    return VLIBCErrGet() == EAGAIN ? 0 : 3;
  });
  EXPECT_EQ(result, 0);
}

TEST_F(PipedChild, LeavesNoDescriptorOpen) {
  Plan(StubPlan());
  const int before = platform_test::CountDescriptors();
  for (int i = 0; i < 5; ++i) {
    FILE* stream = VLIBCPopen(kTool, "rE", nullptr);
    ASSERT_NE(stream, nullptr);
    VLIBCPclose(stream);
    VLIBCPopen("/usr/vela/bin/absent", "r", nullptr);
  }
  EXPECT_EQ(platform_test::CountDescriptors(), before);
}

class PipedChildLimit : public PipedChild {
 protected:
  void SetUp() override {
    PipedChild::SetUp();
    vela_test::WriteFile("/etc/velainfo.conf", "tool_timeout=\"1\"\n");
    start_ = steady_clock::now();
  }

  void ExpectKilledAfterOneSecond() {
    EXPECT_GE(SecondsSince(start_), 1.0);
    EXPECT_LT(SecondsSince(start_), 5.0);
    EXPECT_EQ(CountZombies(), 0);
  }

  steady_clock::time_point start_;
};

const char* const kLimitLine =
    "/usr/vela/bin/piped-tool has not ended within 1 seconds (tool_timeout) and was killed";

TEST_F(PipedChildLimit, EndsTheStreamOfASilentChild) {
  Plan(StubPlan().Print("begun").Sleep(60000));
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(ReadAll(stream), "begun");
  EXPECT_EQ(VLIBCPclose(stream), -1);
  ExpectKilledAfterOneSecond();
  EXPECT_EQ(vela_test::ErrorLines(), std::vector<std::string>{kLimitLine});
}

TEST_F(PipedChildLimit, EndsAChildThatIgnoresEverything) {
  Plan(StubPlan().IgnoreSignal(SIGTERM).IgnoreSignal(SIGPIPE).Sleep(60000));
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(VLIBCPclose(stream), -1);
  ExpectKilledAfterOneSecond();
  EXPECT_EQ(vela_test::ErrorLines(), std::vector<std::string>{kLimitLine});
}

TEST_F(PipedChildLimit, EndsAlsoWhatTheChildHasStarted) {
  FILE* stream = VLIBCPopen("/bin/sh", "r", "-c", "sleep 600 & echo begun; wait", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(ReadAll(stream), "begun\n");
  EXPECT_EQ(VLIBCPclose(stream), -1);
  ExpectKilledAfterOneSecond();
}

TEST_F(PipedChildLimit, EndsAStreamThatAnEndedChildHasLeftToOthers) {
  FILE* stream = VLIBCPopen("/bin/sh", "r", "-c", "sleep 600 & echo begun", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(ReadAll(stream), "begun\n");
  EXPECT_EQ(VLIBCPclose(stream), 0);
  ExpectKilledAfterOneSecond();
  EXPECT_TRUE(vela_test::ErrorLines().empty());
}

TEST_F(PipedChildLimit, DoesNotTouchAChildThatEndsInTime) {
  Plan(StubPlan().Sleep(300).Print("done").Exit(3));
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(ReadAll(stream), "done");
  EXPECT_EQ(VLIBCPclose(stream), 3);
  EXPECT_TRUE(vela_test::ErrorLines().empty());
}

TEST_F(PipedChildLimit, IsNoneForZero) {
  vela_test::WriteFile("/etc/velainfo.conf", "tool_timeout=\"0\"\n");
  Plan(StubPlan().Sleep(1500).Print("done"));
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(ReadAll(stream), "done");
  EXPECT_EQ(VLIBCPclose(stream), 0);
}

TEST_F(PipedChildLimit, IsTheDefaultForAnUnreadableNumber) {
  vela_test::WriteFile("/etc/velainfo.conf", "tool_timeout=\"1s\"\n");
  Plan(StubPlan().Sleep(1500).Print("done"));
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(ReadAll(stream), "done");
  EXPECT_EQ(VLIBCPclose(stream), 0);
}

TEST_F(PipedChildLimit, RunsInItsOwnThreadThatTakesNoSignals) {
  Plan(StubPlan().CreateFile("/tmp/running").Sleep(60000));
  const pid_t caller = platform_test::Fork([] {
    // With the caller's only thread blocking it, the signal could land in the limit's thread only.
    signal(SIGUSR1, [](int) { _exit(77); });
    sigset_t one;
    sigemptyset(&one);
    sigaddset(&one, SIGUSR1);
    FILE* stream = VLIBCPopen(kTool, "r", nullptr);
    sigprocmask(SIG_BLOCK, &one, nullptr);
    if (stream == nullptr) return 1;
    kill(getpid(), SIGUSR1);
    ReadAll(stream);
    VLIBCPclose(stream);
    return 0;
  });
  EXPECT_EQ(platform_test::Join(caller), 0);
}

}  // namespace
