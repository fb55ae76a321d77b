#include "support/call_faults.h"

#include <gtest/gtest.h>
#include <signal.h>

#include <cerrno>
#include <optional>
#include <string>
#include <vector>

#include "support/files.h"
#include "support/program.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

constexpr const char* kFile = "/tmp/file";

class CallFaultsTest : public SandboxTest {
 protected:
  /// Runs a shell script with a fault, or without one; `calls_` receives the calls.
  ProgramResult RunScript(const std::string& script, CallScope scope,
                          const std::optional<CallFault>& fault = std::nullopt) {
    CallFaults faults(scope, fault);
    ProgramOptions options;
    options.beforeExec = {faults.Step()};
    const ProgramResult result = RunProgram("/bin/sh", {"-c", script}, options);
    EXPECT_TRUE(faults.WaitForEnd(10000));
    calls_ = faults.Calls();
    struck_ = faults.HasStruck();
    return result;
  }

  /// The call of this name for kFile in the last run.
  std::optional<MadeCall> Find(const std::string& name) const {
    for (const MadeCall& made : calls_) {
      if (name == made.call->name && made.object == kFile) {
        return made;
      }
    }
    return std::nullopt;
  }

  std::vector<MadeCall> calls_;
  bool struck_ = false;
};

TEST_F(CallFaultsTest, CountsTheCallsOfAnUndisturbedRun) {
  EXPECT_EQ(RunScript("echo text > /tmp/file", CallScope::kProgram).exitCode, 0);
  EXPECT_TRUE(Find("openat"));
  EXPECT_FALSE(struck_);
  EXPECT_EQ(ReadFile(kFile), "text\n");
  for (const MadeCall& made : calls_) {
    EXPECT_NE(made.object.compare(0, 5, "/usr/"), 0) << made.object;
  }
}

TEST_F(CallFaultsTest, MakesOneCallFail) {
  RunScript("echo text > /tmp/file", CallScope::kProgram);
  RemoveTree(kFile);
  CallFault fault;
  fault.made = Find("openat").value();
  fault.error = ENOSPC;
  const ProgramResult result = RunScript("echo text > /tmp/file", CallScope::kProgram, fault);
  EXPECT_NE(result.exitCode, 0);
  EXPECT_NE(result.err.find("No space left on device"), std::string::npos) << result.err;
  EXPECT_TRUE(struck_);
  EXPECT_FALSE(Exists(kFile));
}

TEST_F(CallFaultsTest, LimitsItselfToTools) {
  const std::string script = "touch /tmp/other; (exec touch /tmp/file); echo > /tmp/last";
  RunScript(script, CallScope::kTools);
  RemoveTree(kFile);
  CallFault fault;
  fault.made = Find("openat").value();
  fault.error = EACCES;
  EXPECT_EQ(RunScript(script, CallScope::kTools, fault).exitCode, 0);
  EXPECT_TRUE(struck_);
  EXPECT_FALSE(Exists(kFile));
  EXPECT_TRUE(Exists("/tmp/last"));
}

TEST_F(CallFaultsTest, TransfersHalf) {
  const std::string script = "exec dd if=/tmp/source of=/tmp/file bs=1000 count=1 2>/tmp/log";
  WriteFileOfSize("/tmp/source", 1000);
  RunScript(script, CallScope::kProgram);
  EXPECT_EQ(FileSize(kFile), 1000);
  CallFault fault;
  for (const MadeCall& made : calls_) {
    if (std::string(made.call->name) == "read" && made.object == "/tmp/source") {
      fault.made = made;
    }
  }
  ASSERT_NE(fault.made.call, nullptr);
  fault.error = kShortTransfer;
  EXPECT_EQ(RunScript(script, CallScope::kProgram, fault).exitCode, 0);
  EXPECT_TRUE(struck_);
  EXPECT_EQ(ReadFile(kFile), std::string(500, 'x'));
}

TEST_F(CallFaultsTest, KillsAtACall) {
  RunScript("echo text > /tmp/file", CallScope::kProgram);
  RemoveTree(kFile);
  CallFault fault;
  fault.made = Find("openat").value();
  fault.kill = true;
  EXPECT_EQ(RunScript("echo text > /tmp/file", CallScope::kProgram, fault).signal, SIGKILL);
  EXPECT_FALSE(Exists(kFile));
}

TEST_F(CallFaultsTest, DoesSomethingElseBeforeACall) {
  RunScript("echo text >> /tmp/file", CallScope::kProgram);
  CallFault fault;
  fault.made = Find("openat").value();
  fault.action = [] { WriteFile(kFile, "before\n"); };
  EXPECT_EQ(RunScript("echo text >> /tmp/file", CallScope::kProgram, fault).exitCode, 0);
  EXPECT_EQ(ReadFile(kFile), "before\ntext\n");
}

}  // namespace
}  // namespace vela_test
