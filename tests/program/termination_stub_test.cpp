// Termination by SIGTERM.
#include <signal.h>

#include <chrono>
#include <thread>

#include "program/stub_program_test.h"

namespace vela_test {
namespace {

using ::testing::Each;
using ::testing::StartsWith;

constexpr const char* kRoot = "/tmp/photos/@eaDir";
constexpr std::chrono::seconds kSoon{20};

class Termination : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    MakePhotos({"a.jpg", "b.jpg"});
    Converter().PlanCall(1, StubPlan()
                                .WriteOutputs(1)
                                .CreateFile("/tmp/here")
                                .WaitForFile("/tmp/never")
                                .WriteOutputs());
  }

  /// Sends the signal. Returns how the program ended.
  static ProgramResult End(Program& program, int signal = SIGTERM) {
    program.Kill(signal);
    const auto end = program.Wait(kSoon);
    EXPECT_TRUE(end.has_value());
    return end.value_or(ProgramResult());
  }

  /// Starts the program and sends SIGTERM during its first conversion. Returns how it ended.
  static ProgramResult Terminate(const ProgramOptions& options = ProgramOptions()) {
    Program program = Start({kPhotos, "/tmp/other"}, options);
    EXPECT_TRUE(WaitUntilExists("/tmp/here"));
    return End(program);
  }

  pid_t ConverterPid() const {
    const auto calls = Converter().Calls();
    return calls.empty() ? -1 : calls[0].pid;
  }
};

TEST_F(Termination, ExitsWithOne) {
  const ProgramResult result = Terminate();
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.out, "");
  EXPECT_EQ(result.err, "");
}

TEST_F(Termination, RemovesThePidFileOfThisInstanceOnly) {
  WriteFile("/var/run/velathumb.1.pid", "");
  Terminate();
  EXPECT_THAT(ListDirectory("/run"), ElementsAre("velathumb.1.pid"));
}

TEST_F(Termination, EndsTheConverter) {
  Terminate();
  EXPECT_TRUE(WaitUntilGone("/proc/" + std::to_string(ConverterPid())));
  EXPECT_EQ(Converter().Calls()[0].endSequence, 0U);
}

TEST_F(Termination, EndsTheConvertersOfOthersToo) {
  Converter().PlanWhen("other", StubPlan().CreateFile("/tmp/other.here").WaitForFile("/tmp/never"));
  Program program = Start();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  Program converter = StartProgram(kConverterPath, {"other"});
  Program sleeper = StartProgram("/bin/sleep", {"60"});
  ASSERT_TRUE(WaitUntilExists("/tmp/other.here"));
  EXPECT_EQ(End(program).exitCode, 1);
  const auto converterEnd = converter.Wait(kSoon);
  ASSERT_TRUE(converterEnd.has_value());
  EXPECT_EQ(converterEnd->signal, SIGTERM);
  EXPECT_FALSE(sleeper.Wait(std::chrono::milliseconds(50)).has_value());
}

TEST_F(Termination, LeavesTheDirectoryUnlocked) {
  Terminate();
  EXPECT_TRUE(HeldLock(kRoot).IsHeld());
}

TEST_F(Termination, CleansUpNothingElse) {
  const DaemonPeer daemon;
  Terminate();
  EXPECT_TRUE(WaitUntilGone("/proc/" + std::to_string(ConverterPid())));
  const auto left = MetadataOf("/tmp/photos/a.jpg");
  EXPECT_THAT(left, SizeIs(1));
  EXPECT_THAT(left, Each(StartsWith("VELAPHOTO.tmp.")));
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ReportedPhotos(RequestsOf(daemon)), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Termination, StartsNothingMore) {
  MakePhoto("/tmp/other/a.jpg");
  Terminate();
  EXPECT_THAT(ConvertedSources(), ElementsAre("/tmp/photos/a.jpg"));
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir/b.jpg"));
  EXPECT_FALSE(Exists("/tmp/other/@eaDir"));
}

TEST_F(Termination, DoesNotWaitForAConverterThatWillNotEnd) {
  Converter().PlanCall(
      1, StubPlan().IgnoreSignal(SIGTERM).CreateFile("/tmp/here").WaitForFile("/tmp/never"));
  EXPECT_EQ(Terminate().exitCode, 1);
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
  EXPECT_TRUE(HeldLock(kRoot).IsHeld());
}

TEST_F(Termination, WorksHoweverTheProgramWasStarted) {
  ProgramOptions closed;
  closed.closeInput = closed.closeOutput = closed.closeError = true;
  for (const ProgramOptions& options :
       {WithSteps({IgnoreSignal(SIGCHLD)}), WithSteps({IgnoreSignal(SIGTERM)}), closed}) {
    SetUp();
    EXPECT_EQ(Terminate(options).exitCode, 1);
    EXPECT_THAT(ListDirectory("/run"), IsEmpty());
    EXPECT_TRUE(WaitUntilGone("/proc/" + std::to_string(ConverterPid())));
    EXPECT_TRUE(HeldLock(kRoot).IsHeld());
  }
}

TEST_F(Termination, WorksWhileTheDaemonIsSilent) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Silence());
  Program program = Start();
  ASSERT_TRUE(daemon.WaitForRequests(1));
  EXPECT_EQ(End(program).exitCode, 1);
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_TRUE(HeldLock(kRoot).IsHeld());
}

TEST_F(Termination, WorksWhileTheQueueIsLocked) {
  Converter().PlanCall(1, StubPlan::Normal());
  WriteFile(kQueue, "");
  DaemonPeer daemon;
  const HeldLock queue(kQueue);
  ASSERT_TRUE(queue.IsHeld());
  Program program = Start();
  ASSERT_TRUE(daemon.WaitForRequests(4));
  ASSERT_TRUE(WaitUntilUnlocked(kRoot));
  EXPECT_EQ(End(program).exitCode, 1);
  EXPECT_EQ(ReadFile(kQueue), "");
}

TEST_F(Termination, OtherSignalsKeepTheirMeaning) {
  Program program = Start();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  EXPECT_EQ(End(program, SIGINT).signal, SIGINT);
  EXPECT_THAT(ListDirectory("/run"), SizeIs(1));
}

/// A signal at any moment of a run, however early.
class TerminationAtAnyTime : public Termination, public ::testing::WithParamInterface<int> {};

TEST_P(TerminationAtAnyTime, EndsPromptlyAndLeavesNoPidFile) {
  Converter().PlanCall(1, StubPlan::Normal());
  MakePhoto("/tmp/photos/c.jpg");
  const DaemonPeer daemon;
  Program program = Start();
  std::this_thread::sleep_for(std::chrono::microseconds(GetParam()));
  const ProgramResult end = End(program);
  // Before the handler is installed, the signal has its default effect.
  EXPECT_TRUE(end.exitCode == 1 || end.exitCode == 0 || end.signal == SIGTERM)
      << end.exitCode << " " << end.signal;
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
  EXPECT_TRUE(!Exists(kRoot) || HeldLock(kRoot).IsHeld());
}

INSTANTIATE_TEST_SUITE_P(Microseconds, TerminationAtAnyTime,
                         ::testing::Values(0, 300, 700, 1500, 3000, 5000, 8000, 12000, 17000, 25000,
                                           40000));

}  // namespace
}  // namespace vela_test
