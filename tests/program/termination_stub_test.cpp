// The end by SIGTERM.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>

#include <chrono>
#include <string>
#include <thread>

#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;
using ::testing::StartsWith;

constexpr const char* kRoot = "/tmp/photos/@eaDir";
constexpr std::chrono::seconds kSoon{20};

class Termination : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    MakePhoto("/tmp/photos/a.jpg");
    MakePhoto("/tmp/photos/b.jpg");
    Converter().PlanCall(1, StubPlan()
                                .WriteOutputs(1)
                                .CreateFile("/tmp/here")
                                .WaitForFile("/tmp/never")
                                .WriteOutputs());
  }

  /// Starts the program, waits for its first conversion and sends the signal; how it ended.
  static ProgramResult Terminate(const ProgramOptions& options = ProgramOptions()) {
    Program program = Start({kPhotos, "/tmp/other"}, options);
    EXPECT_TRUE(WaitUntilExists("/tmp/here"));
    program.Kill(SIGTERM);
    const auto end = program.Wait(kSoon);
    EXPECT_TRUE(end.has_value());
    return end.value_or(ProgramResult());
  }

  pid_t ConverterPid() const {
    const auto calls = Converter().Calls();
    return calls.empty() ? -1 : calls[0].pid;
  }
};

TEST_F(Termination, ExitsWithOne) {
  const ProgramResult result = Terminate();
  EXPECT_EQ(1, result.exitCode);
  EXPECT_EQ("", result.out);
  EXPECT_EQ("", result.err);
}

TEST_F(Termination, RemovesThePidFileOfThisInstanceOnly) {
  WriteFile("/var/run/velathumb.1.pid", "");
  Terminate();
  EXPECT_THAT(ListDirectory("/run"), ElementsAre("velathumb.1.pid"));
}

TEST_F(Termination, EndsTheConverter) {
  Terminate();
  EXPECT_TRUE(WaitUntilGone("/proc/" + std::to_string(ConverterPid())));
  EXPECT_EQ(0U, Converter().Calls()[0].endSequence);
}

TEST_F(Termination, EndsTheConvertersOfOthersToo) {
  Converter().PlanWhen("other", StubPlan().CreateFile("/tmp/other.here").WaitForFile("/tmp/never"));
  Program program = Start();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  Program converter = StartProgram(kConverterPath, {"other"});
  Program sleeper = StartProgram("/bin/sleep", {"60"});
  ASSERT_TRUE(WaitUntilExists("/tmp/other.here"));
  program.Kill(SIGTERM);
  const auto end = program.Wait(kSoon);
  ASSERT_TRUE(end.has_value());
  EXPECT_EQ(1, end->exitCode);
  const auto converterEnd = converter.Wait(kSoon);
  ASSERT_TRUE(converterEnd.has_value());
  EXPECT_EQ(SIGTERM, converterEnd->signal);
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
  EXPECT_THAT(ReportedPhotos(daemon), IsEmpty());
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
  EXPECT_EQ(1, Terminate().exitCode);
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
  EXPECT_TRUE(HeldLock(kRoot).IsHeld());
}

TEST_F(Termination, WorksWhenTheCallerIgnoresTheEndOfItsChildren) {
  ProgramOptions options;
  options.beforeExec = {IgnoreSignal(SIGCHLD)};
  EXPECT_EQ(1, Terminate(options).exitCode);
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
  EXPECT_TRUE(WaitUntilGone("/proc/" + std::to_string(ConverterPid())));
}

TEST_F(Termination, WorksWhenTheCallerIgnoresSigTerm) {
  ProgramOptions options;
  options.beforeExec = {IgnoreSignal(SIGTERM)};
  EXPECT_EQ(1, Terminate(options).exitCode);
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
}

TEST_F(Termination, WorksWithoutStandardDescriptors) {
  ProgramOptions options;
  options.closeInput = options.closeOutput = options.closeError = true;
  EXPECT_EQ(1, Terminate(options).exitCode);
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
  EXPECT_TRUE(WaitUntilGone("/proc/" + std::to_string(ConverterPid())));
  EXPECT_TRUE(HeldLock(kRoot).IsHeld());
}

TEST_F(Termination, WorksWhileTheDaemonIsSilent) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Silence());
  Program program = Start();
  ASSERT_TRUE(daemon.WaitForRequests(1));
  program.Kill(SIGTERM);
  const auto end = program.Wait(kSoon);
  ASSERT_TRUE(end.has_value());
  EXPECT_EQ(1, end->exitCode);
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
  program.Kill(SIGTERM);
  const auto end = program.Wait(kSoon);
  ASSERT_TRUE(end.has_value());
  EXPECT_EQ(1, end->exitCode);
  EXPECT_EQ("", ReadFile(kQueue));
}

TEST_F(Termination, OtherSignalsKeepTheirMeaning) {
  Program program = Start();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  program.Kill(SIGINT);
  const auto end = program.Wait(kSoon);
  ASSERT_TRUE(end.has_value());
  EXPECT_EQ(SIGINT, end->signal);
  EXPECT_THAT(ListDirectory("/run"), SizeIs(1));
}

/// A signal that lands at some moment of a run, however early.
class TerminationAtAnyTime : public StubProgramTest, public ::testing::WithParamInterface<int> {};

TEST_P(TerminationAtAnyTime, EndsPromptlyAndLeavesNoPidFile) {
  for (const char* name : {"a.jpg", "b.jpg", "c.jpg"}) {
    MakePhoto(std::string("/tmp/photos/") + name);
  }
  const DaemonPeer daemon;
  Program program = Start();
  std::this_thread::sleep_for(std::chrono::microseconds(GetParam()));
  program.Kill(SIGTERM);
  const auto end = program.Wait(kSoon);
  ASSERT_TRUE(end.has_value());
  // Before the handler is there, the signal ends the program as it does any.
  EXPECT_TRUE(end->exitCode == 1 || end->exitCode == 0 || end->signal == SIGTERM)
      << end->exitCode << " " << end->signal;
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
  EXPECT_TRUE(!Exists(kRoot) || HeldLock(kRoot).IsHeld());
}

INSTANTIATE_TEST_SUITE_P(Microseconds, TerminationAtAnyTime,
                         ::testing::Values(0, 300, 700, 1500, 3000, 5000, 8000, 12000, 17000, 25000,
                                           40000));

}  // namespace
}  // namespace vela_test
