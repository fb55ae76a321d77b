// Running programs and provoking faults in them.
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
  EXPECT_EQ(3, result.exitCode);
  EXPECT_EQ(0, result.signal);
  EXPECT_EQ("out\n", result.out);
  EXPECT_EQ("err\n", result.err);
}

TEST_F(ProgramTest, GivesTheSignalThatEndedIt) {
  const ProgramResult result = Shell("kill -USR1 $$");
  EXPECT_EQ(-1, result.exitCode);
  EXPECT_EQ(SIGUSR1, result.signal);
}

TEST_F(ProgramTest, TellsWhyAProgramCannotBeStarted) {
  EXPECT_EQ(ENOENT, RunProgram("/tmp/missing", {}).startError);
  WriteFile("/tmp/plain", "x");
  EXPECT_EQ(EACCES, RunProgram("/tmp/plain", {}).startError);
  EXPECT_EQ(-1, RunProgram("/tmp/missing", {}).exitCode);
}

TEST_F(ProgramTest, PassesArgumentsByteExact) {
  const std::string odd = std::string("a b\n'\"\xff") + "*";
  EXPECT_EQ(odd + "||", RunProgram("/usr/bin/printf", {"%s|%s|", odd, ""}).out);
}

TEST_F(ProgramTest, LargeOutputNeedsNoReader) {
  Program program = StartProgram("/bin/sh", {"-c", "head -c 3000000 /dev/zero"});
  ASSERT_TRUE(program.Wait().has_value());
  EXPECT_EQ(3000000U, program.Wait()->out.size());
}

TEST_F(ProgramTest, TimeLimitEndsIt) {
  ProgramOptions options;
  options.timeLimit = std::chrono::milliseconds(50);
  const ProgramResult result = RunProgram("/bin/sleep", {"100"}, options);
  EXPECT_TRUE(result.timedOut);
  EXPECT_EQ(SIGKILL, result.signal);
}

TEST_F(ProgramTest, CanBeSignalledWhileItRuns) {
  Program program =
      StartProgram("/bin/sh", {"-c", "trap 'exit 5' TERM; touch /tmp/ready; while :; do :; done"});
  ASSERT_TRUE(WaitUntilExists("/tmp/ready"));
  EXPECT_FALSE(program.Wait(std::chrono::milliseconds(0)).has_value());
  program.Kill(SIGTERM);
  const auto result = program.Wait();
  ASSERT_TRUE(result.has_value());
  EXPECT_EQ(5, result->exitCode);
  EXPECT_GT(result->wallTime.count(), 0);
}

TEST_F(ProgramTest, IsKilledWithItsHandle) {
  pid_t pid = 0;
  {
    const Program program = StartProgram("/bin/sleep", {"100"});
    pid = program.Pid();
    EXPECT_EQ(0, kill(pid, 0));
  }
  EXPECT_EQ(-1, kill(pid, 0));
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
  EXPECT_EQ("0027\n/tmp/d\nred /other\ngiven\nname\n", result.out);
}

TEST_F(ProgramTest, EnvironmentCanBeReplaced) {
  ProgramOptions options;
  options.environment = std::vector<std::string>{"ONLY=1"};
  EXPECT_EQ("ONLY=1\n", RunProgram("/usr/bin/env", {}, options).out);
}

TEST_F(ProgramTest, OnlyStandardDescriptorsReachIt) {
  const Descriptor leak(open("/dev/null", O_RDONLY));  // without close-on-exec
  EXPECT_EQ("0\n1\n2\n", Shell("cd /proc/$$/fd; echo 0; echo 1; echo 2; [ -e " +
                               std::to_string(leak.Get()) + " ] && echo leak; true")
                             .out);
  ProgramOptions options;
  options.keptDescriptors = {leak.Get()};
  EXPECT_EQ(
      "leak\n",
      Shell("[ -e /proc/$$/fd/" + std::to_string(leak.Get()) + " ] && echo leak", options).out);
}

TEST_F(ProgramTest, StandardDescriptorsCanBeClosed) {
  ProgramOptions options;
  options.closeInput = true;
  options.closeError = true;
  EXPECT_EQ("1\n",
            Shell("for f in 0 1 2; do [ -e /proc/$$/fd/$f ] && echo $f; done; true", options).out);
}

TEST_F(ProgramTest, ResourceLimitHolds) {
  const ProgramResult result =
      Shell("head -c 10000 /dev/zero > /tmp/f", With(LimitResource(RLIMIT_FSIZE, 4096)));
  EXPECT_NE(0, result.exitCode);
  EXPECT_EQ(4096, FileSize("/tmp/f"));
}

TEST_F(ProgramTest, WithoutCapabilitiesPermissionBitsHold) {
  MakeDirectories("/tmp/closed");
  ASSERT_EQ(0, chmod("/tmp/closed", 0555));
  EXPECT_EQ(0, Shell("touch /tmp/closed/a").exitCode);
  EXPECT_NE(0, Shell("touch /tmp/closed/b", With(DropCapabilities())).exitCode);
  EXPECT_FALSE(Exists("/tmp/closed/b"));
}

TEST_F(ProgramTest, ThreadCanBeWithoutCapabilities) {
  MakeDirectories("/tmp/closed");
  ASSERT_EQ(0, chmod("/tmp/closed", 0555));
  {
    const WithoutCapabilities without;
    EXPECT_EQ(-1, mkdir("/tmp/closed/a", 0777));
    EXPECT_EQ(EACCES, errno);
  }
  EXPECT_EQ(0, mkdir("/tmp/closed/a", 0777));
}

TEST_F(ProgramTest, SeccompRefusesCalls) {
  WriteFile("/tmp/f", "x");
  const ProgramResult result =
      RunProgram("/bin/chmod", {"600", "/tmp/f"}, With(SeccompFail(ChmodCalls(), EIO)));
  EXPECT_EQ(1, result.exitCode);
  EXPECT_THAT(result.err, HasSubstr("Input/output error"));
  EXPECT_EQ(0, RunProgram("/bin/chmod", {"600", "/tmp/f"}).exitCode);
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
  EXPECT_EQ("content", RunProgram("/bin/cat", {"/tmp/f"}, options).out);
  const ProgramResult result = RunProgram("/bin/cp", {"/tmp/f", "/tmp/g"}, options);
  EXPECT_THAT(result.err, HasSubstr("Too many open files"));
}

TEST_F(ProgramTest, SignalsCanBeIgnoredAndBlocked) {
  EXPECT_EQ("alive\n", Shell("kill -TERM $$; echo alive", With(IgnoreSignal(SIGTERM))).out);
  EXPECT_EQ("alive\n", Shell("kill -TERM $$; echo alive", With(BlockSignal(SIGTERM))).out);
}

}  // namespace
}  // namespace vela_test
