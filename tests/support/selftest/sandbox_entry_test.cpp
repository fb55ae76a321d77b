// How a test program enters the sandbox and how it ends, tested from outside with a separate
// program.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/syscall.h>

#include <cerrno>

#include "support/files.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "support/seccomp_fail.h"
#include "support/selftest/process_count.h"

namespace vela_test {
namespace {

using ::testing::HasSubstr;
using ::testing::StartsWith;

class SandboxEntry : public SandboxTest {};

std::vector<std::string> Arguments(const std::string& test) {
  return {"--gtest_filter=Probe." + test};
}

ProgramResult RunProbe(const std::vector<std::string>& arguments,
                       const ProgramOptions& options = ProgramOptions()) {
  return RunProgram(BuiltPath(PROBE_FILE), arguments, options);
}

ProgramOptions WithoutNamespaces() {
  ProgramOptions options;
  options.beforeExec = {SeccompFail({SYS_unshare}, EPERM)};
  return options;
}

TEST_F(SandboxEntry, ExitStatusIsThatOfTheTests) {
  EXPECT_EQ(RunProbe(Arguments("Passes")).exitCode, 0);
  EXPECT_EQ(RunProbe(Arguments("Fails")).exitCode, 1);
}

TEST_F(SandboxEntry, SignalThatEndsTheTestsIsReported) {
  const ProgramResult result = RunProbe(Arguments("IsKilled"));
  EXPECT_EQ(result.exitCode, 128 + SIGKILL);
  EXPECT_EQ(result.err, "test process ended by signal 9 (Killed)\n");
}

TEST_F(SandboxEntry, RunFailsInOneLineWhereThereIsNoSandbox) {
  const ProgramResult result = RunProbe(Arguments("Passes"), WithoutNamespaces());
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.out, "");
  EXPECT_EQ(
      result.err,
      "test environment: cannot make the user namespace of the sandbox: Operation not permitted\n");
}

TEST_F(SandboxEntry, RunFailsInOneLineWhereNothingCanBeMounted) {
  ProgramOptions options;
  options.beforeExec = {SeccompFail({SYS_mount}, EACCES)};
  const ProgramResult result = RunProbe(Arguments("Passes"), options);
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, StartsWith("test environment: cannot make the mounts"));
  EXPECT_EQ(result.err.find('\n'), result.err.size() - 1);
}

TEST_F(SandboxEntry, ListingTestsNeedsNoSandbox) {
  const ProgramResult result = RunProbe({"--gtest_list_tests"}, WithoutNamespaces());
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.out, HasSubstr("  Passes\n"));
}

TEST_F(SandboxEntry, ResultFileIsWrittenOutside) {
  std::vector<std::string> arguments = Arguments("Passes");
  arguments.push_back("--gtest_output=xml:/tmp/results/new/probe.xml");
  EXPECT_EQ(RunProbe(arguments).exitCode, 0);
  EXPECT_THAT(ReadFile("/tmp/results/new/probe.xml"), HasSubstr("name=\"Passes\""));
}

TEST_F(SandboxEntry, EverythingEndsWithTheProgram) {
  const size_t before = ProcessCount();
  Program program = StartProgram(BuiltPath(PROBE_FILE), Arguments("Sleeps"));
  ASSERT_TRUE(AwaitProcessCount(before + kProcessesOfASandbox));
  program.Kill(SIGKILL);
  program.Wait();
  EXPECT_TRUE(AwaitProcessCount(before));
}

}  // namespace
}  // namespace vela_test
