// A stub tool that the platform starts as a child.
#pragma once

#include <fcntl.h>

#include <csignal>

#include "platform/platform_fixture.h"
#include "support/seccomp_fail.h"
#include "support/stub_tool.h"
#include "support/system_log.h"

namespace vela_test {

class ToolTest : public SandboxTest {
 protected:
  static constexpr const char* kTool = "/usr/vela/bin/some-tool";
  static constexpr const char* kToolName = "some-tool";
  static constexpr const char* kAbsentTool = "/usr/vela/bin/absent";

  void SetUp() override {
    SandboxTest::SetUp();
    tool_ = std::make_unique<StubTool>(kTool);
    Plan(StubPlan());
  }

  void Plan(const StubPlan& plan) { tool_->Plan(plan); }

  StubCall OnlyCall() {
    const auto calls = tool_->Calls();
    EXPECT_EQ(calls.size(), 1U);
    return calls.empty() ? StubCall() : calls[0];
  }

  void ExpectDefaultSignals() {
    EXPECT_TRUE(OnlyCall().ignoredSignals.empty());
    EXPECT_TRUE(OnlyCall().blockedSignals.empty());
  }

  /// Starts a process that makes the call, kills it once the tool runs, and expects the tool to end
  /// too.
  void ExpectEndWithKilledCaller(const std::function<int()>& call) {
    Plan(StubPlan().CreateFile("/tmp/running").Sleep(60000));
    const pid_t caller = Fork(call);
    ASSERT_TRUE(WaitUntilExists("/tmp/running"));
    const pid_t tool = OnlyCall().pid;
    ASSERT_EQ(kill(caller, SIGKILL), 0);
    EXPECT_EQ(Join(caller), -SIGKILL);
    EXPECT_TRUE(WaitUntilEnded(tool));
  }

  std::unique_ptr<StubTool> tool_;
};

/// The same with a time limit of one second.
class LimitedToolTest : public ToolTest {
 protected:
  void SetUp() override {
    ToolTest::SetUp();
    SetLimit("\"1\"");
    watch_ = Stopwatch();
  }

  static void SetLimit(const std::string& value) {
    WriteFile("/etc/velainfo.conf", "tool_timeout=" + value + "\n");
  }

  /// Expects the limit to have ended the child, and the one line that reports it.
  void ExpectKilledAndReported() {
    ExpectKilled();
    EXPECT_EQ(ErrorLines(), Strings{"/usr/vela/bin/some-tool has not ended within 1 seconds "
                                    "(tool_timeout) and was killed"});
  }

  void ExpectKilled() {
    watch_.ExpectBetween(1.0, 5.0);
    EXPECT_EQ(CountZombies(), 0);
  }

  Stopwatch watch_;
};

}  // namespace vela_test
