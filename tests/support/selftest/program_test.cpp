// Running programs and causing faults in them.
#include "support/program.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>

#include "support/descriptor.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/sandbox.h"
#include "support/seccomp_fail.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

class ProgramTest : public SandboxTest {};

ProgramResult Shell(const std::string& script, const ProgramOptions& options = ProgramOptions()) {
  return RunProgram("/bin/sh", {"-c", script}, options);
}

ProgramOptions With(const BeforeExec& step) {
  ProgramOptions options;
  options.beforeExec = {step};
  return options;
}

TEST_F(ProgramTest, GivesExitStatusAndOutput) {
  const ProgramResult result = Shell("echo out; echo err >&2; exit 3");
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(result.signal, 0);
  EXPECT_EQ(result.out, "out\n");
  EXPECT_EQ(result.err, "err\n");
}

TEST_F(ProgramTest, GivesTheSignalThatEndedIt) {
  const ProgramResult result = Shell("kill -USR1 $$");
  EXPECT_EQ(result.exitCode, -1);
  EXPECT_EQ(result.signal, SIGUSR1);
}

TEST_F(ProgramTest, ReportsWhyAProgramCannotBeStarted) {
  EXPECT_EQ(RunProgram("/tmp/missing", {}).startError, ENOENT);
  WriteFile("/tmp/plain", "x");
  EXPECT_EQ(RunProgram("/tmp/plain", {}).startError, EACCES);
  EXPECT_EQ(RunProgram("/tmp/missing", {}).exitCode, -1);
}

TEST_F(ProgramTest, PassesArgumentsByteExact) {
  const std::string odd = std::string("a b\n'\"\xff") + "*";
  EXPECT_EQ(RunProgram("/usr/bin/printf", {"%s|%s|", odd, ""}).out, odd + "||");
}

TEST_F(ProgramTest, LargeOutputNeedsNoReader) {
  Program program = StartProgram("/bin/sh", {"-c", "head -c 3000000 /dev/zero"});
  ASSERT_TRUE(program.Wait().has_value());
  EXPECT_EQ(program.Wait()->out.size(), 3000000U);
}

TEST_F(ProgramTest, TimeLimitEndsIt) {
  ProgramOptions options;
  options.timeLimit = std::chrono::milliseconds(50);
  const ProgramResult result = RunProgram("/bin/sleep", {"100"}, options);
  EXPECT_TRUE(result.timedOut);
  EXPECT_EQ(result.signal, SIGKILL);
}

TEST_F(ProgramTest, CanBeSignalledWhileItRuns) {
  Program program =
      StartProgram("/bin/sh", {"-c", "trap 'exit 5' TERM; touch /tmp/ready; while :; do :; done"});
  ASSERT_TRUE(WaitUntilExists("/tmp/ready"));
  EXPECT_FALSE(program.Wait(std::chrono::milliseconds(0)).has_value());
  program.Kill(SIGTERM);
  const auto result = program.Wait();
  ASSERT_TRUE(result.has_value());
  EXPECT_EQ(result->exitCode, 5);
  EXPECT_GT(result->wallTime.count(), 0);
}

TEST_F(ProgramTest, IsKilledWithItsHandle) {
  pid_t pid = 0;
  {
    const Program program = StartProgram("/bin/sleep", {"100"});
    pid = program.Pid();
    EXPECT_EQ(kill(pid, 0), 0);
  }
  EXPECT_EQ(kill(pid, 0), -1);
}

TEST_F(ProgramTest, SurroundingsAreSet) {
  MakeDirectories("/tmp/d");
  ProgramOptions options;
  options.umask = 027;
  options.workingDirectory = "/tmp/d";
  options.addedEnvironment = {"COLOUR=red", "HOME=/other"};
  options.input = "given";
  options.argumentZero = "name";
  const ProgramResult result =
      RunProgram("/bin/sh", {"-c", "umask; pwd; echo $COLOUR $HOME; cat; echo; echo $0"}, options);
  EXPECT_EQ(result.out, "0027\n/tmp/d\nred /other\ngiven\nname\n");
}

TEST_F(ProgramTest, EnvironmentCanBeReplaced) {
  ProgramOptions options;
  options.environment = std::vector<std::string>{"ONLY=1"};
  EXPECT_EQ(RunProgram("/usr/bin/env", {}, options).out, "ONLY=1\n");
}

TEST_F(ProgramTest, OnlyStandardDescriptorsReachIt) {
  const Descriptor leak(open("/dev/null", O_RDONLY));  // without close-on-exec
  EXPECT_EQ(Shell("cd /proc/$$/fd; echo 0; echo 1; echo 2; [ -e " + std::to_string(leak.Get()) +
                  " ] && echo leak; true")
                .out,
            "0\n1\n2\n");
  ProgramOptions options;
  options.keptDescriptors = {leak.Get()};
  EXPECT_EQ(
      Shell("[ -e /proc/$$/fd/" + std::to_string(leak.Get()) + " ] && echo leak", options).out,
      "leak\n");
}

TEST_F(ProgramTest, StandardDescriptorsCanBeClosed) {
  ProgramOptions options;
  options.closeInput = true;
  options.closeError = true;
  EXPECT_EQ(Shell("for f in 0 1 2; do [ -e /proc/$$/fd/$f ] && echo $f; done; true", options).out,
            "1\n");
}

TEST_F(ProgramTest, ResourceLimitHolds) {
  const ProgramResult result =
      Shell("head -c 10000 /dev/zero > /tmp/f", With(LimitResource(RLIMIT_FSIZE, 4096)));
  EXPECT_NE(result.exitCode, 0);
  EXPECT_EQ(FileSize("/tmp/f"), 4096);
}

TEST_F(ProgramTest, WithoutCapabilitiesPermissionBitsHold) {
  MakeDirectories("/tmp/closed");
  ASSERT_EQ(chmod("/tmp/closed", 0555), 0);
  EXPECT_EQ(Shell("touch /tmp/closed/a").exitCode, 0);
  EXPECT_NE(Shell("touch /tmp/closed/b", With(DropCapabilities())).exitCode, 0);
  EXPECT_FALSE(Exists("/tmp/closed/b"));
}

TEST_F(ProgramTest, ThreadCanBeWithoutCapabilities) {
  MakeDirectories("/tmp/closed");
  ASSERT_EQ(chmod("/tmp/closed", 0555), 0);
  {
    const WithoutCapabilities without;
    EXPECT_EQ(mkdir("/tmp/closed/a", 0777), -1);
    EXPECT_EQ(errno, EACCES);
  }
  EXPECT_EQ(mkdir("/tmp/closed/a", 0777), 0);
}

TEST_F(ProgramTest, SeccompRefusesCalls) {
  WriteFile("/tmp/f", "x");
  const ProgramResult result =
      RunProgram("/bin/chmod", {"600", "/tmp/f"}, With(SeccompFail(ChmodCalls(), EIO)));
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("Input/output error"));
  EXPECT_EQ(RunProgram("/bin/chmod", {"600", "/tmp/f"}).exitCode, 0);
}

TEST_F(ProgramTest, SeccompRefusesRenameAndMkdir) {
  WriteFile("/tmp/f", "x");
  EXPECT_THAT(
      RunProgram("/bin/mv", {"/tmp/f", "/tmp/g"}, With(SeccompFail(RenameCalls(), EACCES))).err,
      HasSubstr("Permission denied"));
  EXPECT_TRUE(Exists("/tmp/f"));
  EXPECT_THAT(RunProgram("/bin/mkdir", {"/tmp/d"}, With(SeccompFail(MkdirCalls(), EDQUOT))).err,
              HasSubstr("quota"));
}

TEST_F(ProgramTest, SeccompCanLookAtOpenFlags) {
  WriteFile("/tmp/f", "content");
  ProgramOptions options = With(SeccompFail(OpensWithFlags(O_CREAT, EMFILE)));
  EXPECT_EQ(RunProgram("/bin/cat", {"/tmp/f"}, options).out, "content");
  const ProgramResult result = RunProgram("/bin/cp", {"/tmp/f", "/tmp/g"}, options);
  EXPECT_THAT(result.err, HasSubstr("Too many open files"));
}

TEST_F(ProgramTest, SignalsCanBeIgnoredAndBlocked) {
  EXPECT_EQ(Shell("kill -TERM $$; echo alive", With(IgnoreSignal(SIGTERM))).out, "alive\n");
  EXPECT_EQ(Shell("kill -TERM $$; echo alive", With(BlockSignal(SIGTERM))).out, "alive\n");
}

}  // namespace
}  // namespace vela_test
