// Children whose output is read through a stream.
#include "platform/tool_fixture.h"

namespace vela_test {
namespace {

/// Reads directly from the descriptor, as callers that copy large outputs do.
std::string ReadAll(FILE* stream) {
  std::string all;
  char buffer[4096];
  for (;;) {
    const ssize_t got = read(fileno(stream), buffer, sizeof(buffer));
    if (got <= 0) return all;
    all.append(buffer, static_cast<size_t>(got));
  }
}

/// The output of a child and the result of closing its stream.
struct Outcome {
  std::string output;
  int status;
};

bool operator==(const Outcome& a, const Outcome& b) {
  return a.output == b.output && a.status == b.status;
}

void PrintTo(const Outcome& outcome, std::ostream* out) {
  *out << "status " << outcome.status << " '" << outcome.output.substr(0, 100) << "'";
}

Outcome ReadAndClose(FILE* stream) {
  if (stream == nullptr) return {"not started", -100};
  const std::string output = ReadAll(stream);
  return {output, VLIBCPclose(stream)};
}

class PipedChild : public ToolTest {
 protected:
  static FILE* Open(const char* mode = "r") { return VLIBCPopen(kTool, mode, nullptr); }

  /// Starts the child and closes its stream without reading. Returns its status, -100 when it could
  /// not be started.
  static int OpenAndClose(const char* mode = "r") {
    FILE* const stream = Open(mode);
    return stream == nullptr ? -100 : VLIBCPclose(stream);
  }

  static Outcome Run(const char* mode = "r") { return ReadAndClose(Open(mode)); }
};

TEST_F(PipedChild, GetsItsPathAndArgumentsUnchanged) {
  FILE* stream = VLIBCPopen(kTool, "r", "-v", "a b", "", "$(x)`y`;'\"\\*", "\xff\n", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(VLIBCPclose(stream), 0);
  EXPECT_EQ(OnlyCall().arguments, (Strings{kTool, "-v", "a b", "", "$(x)`y`;'\"\\*", "\xff\n"}));
}

TEST_F(PipedChild, GivesItsOutputThroughTheStream) {
  Plan(StubPlan().Print(std::string("first\nsecond\n\0third", 19)));
  FILE* stream = Open();
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
  EXPECT_EQ(Run("rB"), (Outcome{std::string(5000000, 'x'), 0}));
}

TEST_F(PipedChild, IncludesStandardErrorOnRequest) {
  Plan(StubPlan().PrintError("error ").Print("output"));
  for (const char* mode : {"rE", "rBE", "rEB"}) {
    EXPECT_EQ(Run(mode), (Outcome{"error output", 0})) << mode;
  }
}

TEST_F(PipedChild, DiscardsStandardErrorOtherwise) {
  Plan(StubPlan().PrintErrorRepeated(std::string(1000, 'e'), 1000).Print("output"));
  for (const char* mode : {"r", "rB"}) EXPECT_EQ(Run(mode), (Outcome{"output", 0})) << mode;
}

TEST_F(PipedChild, GivesItsExitStatus) {
  for (const int status : {0, 1, 7, 255}) {
    Plan(StubPlan().Exit(status));
    EXPECT_EQ(OpenAndClose(), status);
  }
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(PipedChild, GivesMinusOneWhenASignalEndsIt) {
  Plan(StubPlan().Print("half").DieBySignal(SIGSEGV));
  EXPECT_EQ(Run(), (Outcome{"half", -1}));
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(PipedChild, IsNullWhenTheProgramCannotBeStarted) {
  WriteFile("/tmp/text", "no program");
  ASSERT_EQ(chmod("/tmp/text", 0755), 0);
  const struct {
    const char* path;
    int error;
    const char* otherwise;
  } cases[] = {{kAbsentTool, ENOENT, ""},
               {"/usr/vela", EACCES, ""},
               {"/tmp/text", ENOEXEC, "taken for a shell script"},
               {kToolName, ENOENT, "searched for"},
               {"", ENOENT, ""}};
  for (const auto& [path, error, otherwise] : cases) {
    EXPECT_EQ(VLIBCPopen(path, "r", nullptr), nullptr) << path << " " << otherwise;
    EXPECT_EQ(VLIBCErrGet(), error) << path;
  }
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(PipedChild, IsNullForBadArguments) {
  EXPECT_EQ(VLIBCPopen(nullptr, "r", nullptr), nullptr);
  for (const char* mode : {static_cast<const char*>(nullptr), "w", ""}) {
    EXPECT_EQ(Open(mode), nullptr);
  }
  EXPECT_TRUE(tool_->Calls().empty());
}

TEST_F(PipedChild, HasTheThreeStandardDescriptorsOnly) {
  WriteFile("/tmp/inherited", "");
  const int plain = open("/tmp/inherited", O_RDONLY);
  const int high = fcntl(plain, F_DUPFD, 700);
  EXPECT_EQ(OpenAndClose(), 0);
  close(plain);
  close(high);
  const auto descriptors = OnlyCall().descriptors;
  ASSERT_EQ(descriptors.size(), 3U);
  const char* const targets[] = {"/dev/null", "socket:", "/dev/null"};
  for (int number = 0; number < 3; ++number) {
    EXPECT_EQ(descriptors[number].number, number);
    EXPECT_THAT(descriptors[number].target, testing::StartsWith(targets[number]));
  }
}

TEST_F(PipedChild, HasThemEvenWhenTheCallerHasNone) {
  Plan(StubPlan().PrintError("error ").Print("output"));
  const int result = RunForked([] {
    for (int fd = 0; fd < 3; ++fd) close(fd);
    return Run("rE") == Outcome{"error output", 0} ? 0 : 1;
  });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(OnlyCall().descriptors.size(), 3U);
}

TEST_F(PipedChild, HasDefaultSignalsAndNoneBlocked) {
  InOwnProcess([] {
    for (int number = 1; number < SIGRTMAX; ++number) {
      if (number != SIGCHLD) signal(number, SIG_IGN);
    }
    sigset_t set;
    sigfillset(&set);
    sigprocmask(SIG_SETMASK, &set, nullptr);
    EXPECT_EQ(OpenAndClose(), 0);
    sigprocmask(SIG_SETMASK, nullptr, &set);
    EXPECT_EQ(sigismember(&set, SIGTERM), 1);
    EXPECT_EQ(sigismember(&set, SIGUSR1), 1);
  });
  ExpectDefaultSignals();
}

TEST_F(PipedChild, KeepsTheCallersSignalMask) {
  sigset_t before;
  sigprocmask(SIG_SETMASK, nullptr, &before);
  EXPECT_EQ(OpenAndClose(), 0);
  sigset_t after;
  sigprocmask(SIG_SETMASK, nullptr, &after);
  for (int number = 1; number < SIGRTMAX; ++number) {
    EXPECT_EQ(sigismember(&after, number), sigismember(&before, number)) << number;
  }
}

TEST_F(PipedChild, GivesItsStatusToACallerThatIgnoresSigchld) {
  Plan(StubPlan().Exit(9));
  InOwnProcess([] {
    signal(SIGCHLD, SIG_IGN);
    for (int round = 0; round < 3; ++round) {
      EXPECT_EQ(OpenAndClose(), 9);
      struct sigaction now;
      sigaction(SIGCHLD, nullptr, &now);
      EXPECT_EQ(now.sa_handler, SIG_IGN);
    }
  });
}

TEST_F(PipedChild, GivesItsStatusWhereTheSystemReapsChildren) {
  Plan(StubPlan().Exit(9));
  InOwnProcess([] {
    struct sigaction action = {};
    action.sa_handler = SIG_DFL;
    action.sa_flags = SA_NOCLDWAIT;
    sigaction(SIGCHLD, &action, nullptr);
    EXPECT_EQ(OpenAndClose(), 9);
    sigaction(SIGCHLD, nullptr, &action);
    EXPECT_NE(action.sa_flags & SA_NOCLDWAIT, 0);
  });
}

TEST_F(PipedChild, IsWaitedForAcrossInterruptions) {
  Plan(StubPlan().Sleep(300).Exit(4));
  EXPECT_EQ(RunInterrupted([] { return OpenAndClose(); }), 4);
}

TEST_F(PipedChild, EndsByTheClosedPipeWhenReadingStops) {
  Plan(StubPlan().PrintRepeated(std::string(1000, 'x'), 100000));
  FILE* stream = Open();
  ASSERT_NE(stream, nullptr);
  char line[16];
  ASSERT_NE(fgets(line, sizeof(line), stream), nullptr);
  EXPECT_EQ(VLIBCPclose(stream), -1) << "SIGPIPE";
  EXPECT_EQ(CountZombies(), 0);
}

TEST_F(PipedChild, IsWaitedForEvenWhenItIgnoresTheClosedPipe) {
  Plan(StubPlan()
           .IgnoreSignal(SIGPIPE)
           .PrintRepeated(std::string(1000, 'x'), 1000)
           .Sleep(200)
           .CreateFile("/tmp/end-reached")
           .Exit(5));
  EXPECT_EQ(OpenAndClose(), 5);
  EXPECT_TRUE(Exists("/tmp/end-reached"));
}

TEST_F(PipedChild, IsWaitedForAfterItHasClosedItsOutput) {
  Plan(StubPlan().Print("all").CloseOutput().Sleep(200).CreateFile("/tmp/end-reached").Exit(6));
  EXPECT_EQ(Run(), (Outcome{"all", 6}));
  EXPECT_TRUE(Exists("/tmp/end-reached"));
}

TEST_F(PipedChild, RefusesOtherStreams) {
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
  EXPECT_EQ(ReadAndClose(fast), (Outcome{"fast", 2}));
  EXPECT_EQ(ReadAndClose(slow), (Outcome{"slow", 1}));
}

TEST_F(PipedChild, DoesNotKeepTheStreamsOfOthersOpen) {
  tool_->PlanWhen("first", StubPlan().Print("first"));
  tool_->PlanWhen("second", StubPlan().WaitForFile("/tmp/go"));
  FILE* first = VLIBCPopen(kTool, "r", "first", nullptr);
  FILE* second = VLIBCPopen(kTool, "r", "second", nullptr);
  ASSERT_NE(second, nullptr);
  // This would hang if the second child had the pipe open.
  EXPECT_EQ(ReadAndClose(first), (Outcome{"first", 0}));
  WriteFile("/tmp/go", "");
  EXPECT_EQ(VLIBCPclose(second), 0);
}

TEST_F(PipedChild, EndsWithACallerThatIsKilled) {
  ExpectEndWithKilledCaller([] { return OpenAndClose(); });
}

TEST_F(PipedChild, HasItsCommandNameFromTheStart) {
  Plan(StubPlan().Sleep(60000));
  for (int round = 0; round < 200; ++round) {
    FILE* stream = Open();
    ASSERT_NE(stream, nullptr);
    ASSERT_EQ(VLIBCKill(kToolName, SIGKILL), 1) << "round " << round;
    ASSERT_EQ(VLIBCPclose(stream), -1);
  }
}

TEST_F(PipedChild, IsNullWhenNoProcessCanBeStarted) {
  InOwnProcess([] {
    ASSERT_EQ(SeccompFail(ForkCalls(), EAGAIN)(), 0);
    EXPECT_EQ(Open(), nullptr);
    EXPECT_EQ(VLIBCErrGet(), EAGAIN);
  });
}

TEST_F(PipedChild, LeavesNoDescriptorOpen) {
  ExpectNoDescriptorLeak([] {
    for (int i = 0; i < 5; ++i) {
      EXPECT_EQ(OpenAndClose("rE"), 0);
      VLIBCPopen(kAbsentTool, "r", nullptr);
    }
  });
}

class PipedChildLimit : public LimitedToolTest {
 protected:
  static Outcome Run() { return ReadAndClose(VLIBCPopen(kTool, "r", nullptr)); }
  static Outcome RunShell(const char* script) {
    return ReadAndClose(VLIBCPopen("/bin/sh", "r", "-c", script, nullptr));
  }
};

TEST_F(PipedChildLimit, EndsTheStreamOfASilentChild) {
  Plan(StubPlan().Print("begun").Sleep(60000));
  EXPECT_EQ(Run(), (Outcome{"begun", -1}));
  ExpectKilledAndReported();
}

TEST_F(PipedChildLimit, EndsAChildThatIgnoresEverything) {
  Plan(StubPlan().IgnoreSignal(SIGTERM).IgnoreSignal(SIGPIPE).Sleep(60000));
  FILE* stream = VLIBCPopen(kTool, "r", nullptr);
  ASSERT_NE(stream, nullptr);
  EXPECT_EQ(VLIBCPclose(stream), -1);
  ExpectKilledAndReported();
}

TEST_F(PipedChildLimit, EndsAlsoWhatTheChildHasStarted) {
  EXPECT_EQ(RunShell("sleep 600 & echo begun; wait"), (Outcome{"begun\n", -1}));
  ExpectKilled();
}

TEST_F(PipedChildLimit, EndsAStreamThatAnEndedChildHasLeftToOthers) {
  EXPECT_EQ(RunShell("sleep 600 & echo begun"), (Outcome{"begun\n", 0}));
  ExpectKilled();
  EXPECT_TRUE(ErrorLines().empty());
}

TEST_F(PipedChildLimit, DoesNotTouchAChildThatEndsInTime) {
  Plan(StubPlan().Sleep(300).Print("done").Exit(3));
  EXPECT_EQ(Run(), (Outcome{"done", 3}));
  EXPECT_TRUE(ErrorLines().empty());
}

TEST_F(PipedChildLimit, IsDisabledByZero) {
  SetLimit("\"0\"");
  Plan(StubPlan().Sleep(1500).Print("done"));
  EXPECT_EQ(Run(), (Outcome{"done", 0}));
}

TEST_F(PipedChildLimit, IsTheDefaultForAnUnreadableNumber) {
  SetLimit("\"1s\"");
  Plan(StubPlan().Sleep(1500).Print("done"));
  EXPECT_EQ(Run(), (Outcome{"done", 0}));
}

TEST_F(PipedChildLimit, RunsInItsOwnThreadThatTakesNoSignals) {
  Plan(StubPlan().CreateFile("/tmp/running").Sleep(60000));
  const int result = RunForked([] {
    // The caller's only thread blocks the signal, so only the thread of the limit could receive it.
    signal(SIGUSR1, [](int) { _exit(77); });
    sigset_t one;
    sigemptyset(&one);
    sigaddset(&one, SIGUSR1);
    FILE* stream = VLIBCPopen(kTool, "r", nullptr);
    sigprocmask(SIG_BLOCK, &one, nullptr);
    kill(getpid(), SIGUSR1);
    return ReadAndClose(stream).status == -100 ? 1 : 0;
  });
  EXPECT_EQ(result, 0);
}

}  // namespace
}  // namespace vela_test
