// A velathumb that makes no progress is ended, one that works is not.
#include <sys/stat.h>
#include <sys/syscall.h>

#include <csignal>

#include "queue_fixture.h"
#include "stall_watch.h"
#include "support/seccomp_fail.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::milliseconds;
using std::chrono::minutes;
using std::chrono::seconds;

constexpr int kForever = 100000;  // milliseconds

class StallTest : public QueueTest {
 protected:
  static void SetLimits(const std::string& settings) {
    WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"1\"\n" + settings);
  }

  StallTest() { SetLimits("stall_timeout=\"2\"\n"); }

  /// Fails the test unless /tmp/a is deferred, /tmp/b is done and the run does not last too long.
  static void ExpectFirstIsDeferred(const ProgramResult& result) {
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_EQ(ReadFile(kLaterFile), "/tmp/a\n");
    EXPECT_FALSE(Exists(kTakenFile));
    EXPECT_THAT(result.err, HasSubstr("deferred to a later run, velathumb made no progress for 2 "
                                      "seconds: /tmp/a\n"));
    EXPECT_LT(result.wallTime, seconds(30));
  }

  void RunAndExpectFirstIsDeferred(const StubPlan& first) {
    velathumb_.Stub().PlanWhen("/tmp/a", first);
    Enqueue({"/tmp/a", "/tmp/b"});
    ExpectFirstIsDeferred(velathumb_.Run());
    EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b"));
  }

  void ExpectIsNotEnded(const StubPlan& plan) {
    velathumb_.Stub().Plan(plan);
    Enqueue({"/tmp/a"});
    EXPECT_THAT(ExpectRun({"/tmp/a"}), Not(HasSubstr("progress")));
  }
};

TEST_F(StallTest, AVelathumbThatDoesNothingIsEndedAndItsEntryDeferred) {
  RunAndExpectFirstIsDeferred(StubPlan().Sleep(kForever));
  EXPECT_TRUE(WaitUntilEnded(velathumb_.Stub().Calls().front().pid));
}

TEST_F(StallTest, AVelathumbThatIgnoresTheSignalIsKilled) {
  RunAndExpectFirstIsDeferred(StubPlan().IgnoreSignal(SIGTERM).Sleep(kForever));
  EXPECT_TRUE(WaitUntilEnded(velathumb_.Stub().Calls().front().pid));
}

TEST_F(StallTest, AVelathumbThatCannotBeKilledDoesNotHoldUpTheQueue) {
  velathumb_.Stub().PlanWhen("/tmp/a", StubPlan().Sleep(kForever));
  Enqueue({"/tmp/a", "/tmp/b"});
  ProgramOptions options;
  options.beforeExec = {SeccompFail({SYS_kill}, EPERM)};
  ExpectFirstIsDeferred(RunProgram(QueueProgramPath(), velathumb_.Arguments(), options));
}

TEST_F(StallTest, AToolThatDoesNothingBeyondItsOwnLimitIsNoProgress) {
  SetLimits("stall_timeout=\"2\"\ntool_timeout=\"1\"\n");
  RunAndExpectFirstIsDeferred(StubPlan().Run("/bin/sleep", {"100"}));
}

TEST_F(StallTest, AnIdleToolIsProgressWithinItsOwnLimit) {
  ExpectIsNotEnded(StubPlan().Run("/bin/sleep", {"5"}));
}

TEST_F(StallTest, WithoutALimitAnIdleVelathumbIsNotEnded) {
  SetLimits("stall_timeout=\"0\"\n");
  ExpectIsNotEnded(StubPlan().Sleep(5000));
}

TEST_F(StallTest, ByDefaultAnIdleVelathumbIsNotEndedSoon) {
  SetLimits("");
  ExpectIsNotEnded(StubPlan().Sleep(5000));
}

TEST_F(StallTest, AVelathumbThatCalculatesLongerThanTheLimitIsNotEnded) {
  const std::string busy = "/tmp/busy";
  WriteFile(busy,
            "#!/bin/sh\n"
            "now() { read -r time rest </proc/uptime; time=${time%.*}; }\n"
            "now; end=$((time + 6))\n"
            "while [ $time -lt $end ]; do now; done\n"
            ": >/tmp/finished\n");
  ASSERT_EQ(chmod(busy.c_str(), 0755), 0);
  Enqueue({"/tmp/a"});
  const ProgramResult result =
      RunProgram(QueueProgramPath(), {"--velathumb", busy, "--profile", kProfiles});
  EXPECT_EQ(result.exitCode, 0) << result.err;
  EXPECT_TRUE(Exists("/tmp/finished"));
  ExpectQueueDone();
}

TEST_F(StallTest, TheOtherDirectoriesOfATreeAreProcessed) {
  velathumb_.Stub().PlanWhen("R:/tmp/t", StubPlan().Sleep(kForever));
  velathumb_.Stub().PlanWhen("/tmp/t/bad", StubPlan().Sleep(kForever));
  MakeDirectories("/tmp/t/bad");
  MakeDirectories("/tmp/t/good");
  Enqueue({"R:/tmp/t"});
  const ProgramResult result = velathumb_.Run();
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(velathumb_.Entries(),
              UnorderedElementsAre("R:/tmp/t", "/tmp/t", "/tmp/t/bad", "/tmp/t/good"));
  EXPECT_EQ(ReadFile(kLaterFile), "/tmp/t/bad\n");
  EXPECT_FALSE(Exists(kTakenFile));
}

/// With times and activities of the test's own.
class StallWatchTest : public Test {
 protected:
  using Action = StallWatch::Action;

  StallWatch Watch(StallLimits limits) {
    return StallWatch(limits, now_, [this] { return activity_; });
  }

  /// Checks when the watch asks for it until there is something to do. Returns the time until then.
  std::pair<Action, seconds> NextAction(StallWatch& watch) {
    const auto start = now_;
    for (int i = 0; i < 10000; ++i) {
      now_ = *watch.NextCheck();
      const Action action = watch.Check(now_);
      if (action != Action::kNone) {
        return {action, std::chrono::duration_cast<seconds>(now_ - start)};
      }
    }
    return {Action::kNone, seconds(0)};
  }

  StallWatch::Clock::time_point now_ = StallWatch::Clock::now();
  std::optional<ProcessActivity> activity_ = ProcessActivity{};
};

TEST_F(StallWatchTest, EndsAnIdleProcessInSteps) {
  StallWatch watch = Watch({seconds(900), seconds(600)});
  EXPECT_EQ(NextAction(watch), std::pair(Action::kTerminate, seconds(900)));
  EXPECT_TRUE(watch.HasStalled());
  EXPECT_EQ(NextAction(watch), std::pair(Action::kKill, seconds(5)));
  EXPECT_EQ(NextAction(watch), std::pair(Action::kGiveUp, seconds(5)));
  EXPECT_EQ(watch.NextCheck(), std::nullopt);
}

TEST_F(StallWatchTest, ChecksNothingWithoutALimit) {
  StallWatch watch = Watch({seconds(0), seconds(600)});
  EXPECT_EQ(watch.NextCheck(), std::nullopt);
  EXPECT_EQ(watch.Check(now_ + std::chrono::hours(1000)), Action::kNone);
}

TEST_F(StallWatchTest, BeginsAnewAfterProgress) {
  StallWatch watch = Watch({seconds(900), seconds(600)});
  now_ += seconds(30);
  EXPECT_EQ(watch.Check(now_), Action::kNone);
  activity_->cpuTime = 1;
  EXPECT_EQ(NextAction(watch), std::pair(Action::kTerminate, seconds(930)));
}

TEST_F(StallWatchTest, CountsWaitingForAProcessorAsProgress) {
  StallWatch watch = Watch({seconds(900), seconds(600)});
  activity_->isRunning = true;
  for (int i = 0; i < 100; ++i) {
    now_ += seconds(30);
    EXPECT_EQ(watch.Check(now_), Action::kNone);
  }
  activity_->isRunning = false;
  EXPECT_EQ(NextAction(watch), std::pair(Action::kTerminate, seconds(900)));
}

TEST_F(StallWatchTest, CountsWritesAsProgress) {
  StallWatch watch = Watch({seconds(900), seconds(600)});
  activity_->written = 100;
  EXPECT_EQ(NextAction(watch), std::pair(Action::kTerminate, seconds(930)));
}

TEST_F(StallWatchTest, CountsAToolOnlyUpToItsLimit) {
  StallWatch watch = Watch({seconds(900), seconds(600)});
  activity_->descendants = {{1000, 5}};
  // Seen first after 30 s, progress until 600 s later.
  EXPECT_EQ(NextAction(watch), std::pair(Action::kTerminate, seconds(30 + 570 + 900)));
}

TEST_F(StallWatchTest, CountsEachToolAnew) {
  StallWatch watch = Watch({seconds(900), seconds(600)});
  for (uint64_t tool = 1; tool < 10; ++tool) {
    // Each has the same process id.
    activity_->descendants = {{1000, tool}};
    now_ += seconds(500);
    EXPECT_EQ(watch.Check(now_), Action::kNone) << tool;
  }
}

TEST_F(StallWatchTest, DoesNotCountTheTimeInWhichItWasSuspendedItself) {
  StallWatch watch = Watch({seconds(900), seconds(600)});
  now_ += std::chrono::hours(24);
  EXPECT_EQ(watch.Check(now_), Action::kNone);
}

TEST_F(StallWatchTest, EndsNothingThatItCannotExamine) {
  StallWatch watch = Watch({seconds(900), seconds(600)});
  activity_.reset();
  for (int i = 0; i < 100; ++i) {
    now_ += seconds(30);
    EXPECT_EQ(watch.Check(now_), Action::kNone);
  }
}

}  // namespace
}  // namespace vela_test
