// ImageMagick in a child, where it is not installed under the converter's name.

#include <chrono>
#include <csignal>
#include <cstdlib>
#include <optional>
#include <thread>

#include "converter_fixture.h"
#include "process/idle_time.h"
#include "support/stub_files.h"
#include "support/stub_tool.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr int kLongMilliseconds = 100000;

class HandOverToChild : public ConverterTest {
 protected:
  const std::string started_ = std::string(kStubDirectory) + "/started";
  const std::vector<std::string> arguments_ = {"/a.jpg", "-blur", "0x1", "/tmp/converter/b.png"};

  static ProgramOptions Recorded() {
    ProgramOptions options;
    options.addedEnvironment = {std::string("TMPDIR=") + kStubDirectory};
    return options;
  }

  StubPlan EndlessWork() const { return StubPlan().CreateFile(started_).Sleep(kLongMilliseconds); }

  Program Start() const {
    Program program = StartProgram(ConvertThumbPath(), arguments_, Recorded());
    EXPECT_TRUE(WaitUntilExists(started_));
    return program;
  }

  static std::string ProcessDirectory(pid_t pid) { return "/proc/" + std::to_string(pid); }

  /// Waits until the process has a handler of the signal; returns whether it has.
  static bool WaitUntilCaught(pid_t pid, int signal) {
    constexpr char kCaught[] = "\nSigCgt:\t";
    for (int i = 0; i < 1000; ++i) {
      const std::string status = ReadFile(ProcessDirectory(pid) + "/status");
      const size_t caught = status.find(kCaught);
      if (caught == std::string::npos) {
        return false;
      }
      const char* const mask = status.c_str() + caught + sizeof kCaught - 1;
      if ((std::strtoull(mask, nullptr, 16) >> (signal - 1) & 1) != 0) {
        return true;
      }
      std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    return false;
  }
};

TEST_F(HandOverToChild, KeepsTheProcessAndItsName) {
  const StubTool stub(kImageMagick);
  stub.Plan(EndlessWork());
  const Program program = Start();
  ASSERT_THAT(stub.Calls(), SizeIs(1));
  EXPECT_EQ(stub.Calls().front().parentPid, program.Pid());
  EXPECT_EQ(stub.Calls().front().Parameters(), arguments_);
  EXPECT_EQ(ReadFile(ProcessDirectory(program.Pid()) + "/comm"), "convert-thumb\n");
}

TEST_F(HandOverToChild, EndsWithItsStatus) {
  const StubTool stub(kImageMagick);
  for (const int status : {0, 1, 7}) {
    stub.Plan(StubPlan().Exit(status));
    EXPECT_EQ(RunConverter(arguments_, Recorded()).exitCode, status);
  }
}

TEST_F(HandOverToChild, EndsWithItsStatusEvenWhenSigchldIsIgnored) {
  const StubTool stub(kImageMagick);
  stub.Plan(StubPlan().Exit(7));
  ProgramOptions options = Recorded();
  options.beforeExec = {IgnoreSignal(SIGCHLD)};
  EXPECT_EQ(RunConverter(arguments_, options).exitCode, 7);
}

TEST_F(HandOverToChild, EndsByItsSignal) {
  const StubTool stub(kImageMagick);
  for (const int signal : {SIGKILL, SIGSEGV, SIGTERM, SIGXCPU, SIGABRT}) {
    stub.Plan(StubPlan().DieBySignal(signal));
    EXPECT_EQ(RunConverter(arguments_, Recorded()).signal, signal);
  }
}

TEST_F(HandOverToChild, PassesSignalsOn) {
  const StubTool stub(kImageMagick);
  stub.Plan(EndlessWork());
  for (const int signal : {SIGTERM, SIGINT, SIGHUP, SIGQUIT}) {
    RemoveTree(started_);
    Program program = Start();
    const pid_t child = stub.Calls().back().pid;
    program.Kill(signal);
    const std::optional<ProgramResult> result = program.Wait();
    ASSERT_TRUE(result) << signal;
    EXPECT_EQ(result->signal, signal);
    EXPECT_FALSE(Exists(ProcessDirectory(child))) << signal;
  }
  EXPECT_THAT(LogMessages(), IsEmpty()) << "the photo has not failed";
}

TEST_F(HandOverToChild, EndsAChildThatStopsWorking) {
  const StubTool stub(kImageMagick);
  stub.Plan(EndlessWork());
  Program program = Start();
  ASSERT_TRUE(WaitUntilCaught(program.Pid(), SIGALRM));
  // Each signal is a look at the child; otherwise there is one every second.
  std::optional<ProgramResult> result;
  for (int looks = 0; looks < 10000 && !result; ++looks) {
    program.Kill(SIGALRM);
    result = program.Wait(std::chrono::milliseconds(2));
  }
  ASSERT_TRUE(result);
  EXPECT_EQ(result->exitCode, 1);
  EXPECT_EQ(result->err, "convert-thumb: ImageMagick did nothing for 180 seconds\n");
  EXPECT_THAT(ErrorLines(),
              ElementsAre("convert-thumb: /a.jpg: ImageMagick did nothing for 180 seconds"));
  EXPECT_FALSE(Exists(arguments_.back()));
  EXPECT_FALSE(Exists(ProcessDirectory(stub.Calls().front().pid)));
}

TEST(IdleTime, CountsLooksWithoutWork) {
  vela::IdleTime idle;
  EXPECT_EQ(idle.Update(0, 0), 0);
  EXPECT_EQ(idle.Update(0, 0), 1);
  EXPECT_EQ(idle.Update(0, 0), 2);
}

TEST(IdleTime, EndsWithAnyWork) {
  vela::IdleTime idle;
  idle.Update(7, 500);
  idle.Update(7, 500);
  EXPECT_EQ(idle.Update(7, 501), 0);
  EXPECT_EQ(idle.Update(7, 501), 1);
  EXPECT_EQ(idle.Update(8, 501), 0);
  EXPECT_EQ(idle.Update(8, 501), 1);
}

TEST_F(HandOverToChild, LogsTheSignalThatEndedIt) {
  const StubTool stub(kImageMagick);
  stub.Plan(StubPlan().DieBySignal(SIGKILL));
  RunConverter(arguments_, Recorded());
  EXPECT_THAT(ErrorLines(), ElementsAre("convert-thumb: /a.jpg: ImageMagick was ended by signal 9: "
                                        "Killed"));
}

TEST_F(HandOverToChild, LeavesIgnoredSignalsIgnored) {
  const StubTool stub(kImageMagick);
  ProgramOptions options = Recorded();
  options.beforeExec = {IgnoreSignal(SIGHUP)};
  RunConverter(arguments_, options);
  ASSERT_THAT(stub.Calls(), SizeIs(1));
  EXPECT_THAT(stub.Calls().front().ignoredSignals, Contains(SIGHUP));
  EXPECT_THAT(stub.Calls().front().ignoredSignals, Not(Contains(SIGTERM)));
  EXPECT_THAT(stub.Calls().front().blockedSignals, SizeIs(0));
}

TEST_F(HandOverToChild, IgnoresNoMoreSignalsThanIt) {
  const StubTool stub(kImageMagick);
  for (const auto& action : {SIG_DFL, SIG_IGN}) {
    ProgramOptions options = Recorded();
    options.beforeExec = {SetSignals({SIGPIPE, SIGXFSZ}, action)};
    RunConverter(arguments_, options);
    const std::vector<int> ignored = stub.Calls().back().ignoredSignals;
    EXPECT_EQ(Value(ignored, Contains(SIGPIPE)), action == SIG_IGN);
    EXPECT_EQ(Value(ignored, Contains(SIGXFSZ)), action == SIG_IGN);
  }
}

TEST_F(HandOverToChild, KillsTheChildWhenItIsKilled) {
  const StubTool stub(kImageMagick);
  stub.Plan(EndlessWork());
  const Program program = Start();
  program.Kill(SIGKILL);
  EXPECT_TRUE(WaitUntilGone(ProcessDirectory(stub.Calls().front().pid)));
}

TEST_F(HandOverToChild, FailsWhenTheProgramCannotRun) {
  RemoveTool(kImageMagick);
  const ProgramResult result = RunConverter(arguments_);
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err,
            std::string("convert-thumb: ") + kImageMagick + ": No such file or directory\n");
}

TEST_F(HandOverToChild, FailsWithAStatusWhenStandardErrorIsBroken) {
  RemoveTool(kImageMagick);
  ProgramOptions options;
  options.beforeExec = {SetSignals({SIGPIPE}, SIG_DFL), BreakErrorPipe()};
  EXPECT_EQ(RunConverter(arguments_, options).exitCode, 1);
}

}  // namespace
}  // namespace vela_test
