// How soon a stopped runner ends, and what it leaves to the next one.
#include <signal.h>
#include <unistd.h>

#include "entry_check.h"
#include "posix/event_wait.h"
#include "progress_totals.h"
#include "queue_fixture.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::milliseconds;
using std::chrono::steady_clock;

/// Ten seconds pass before what does not end by itself is killed. How fast a stop is on an idle
/// machine is tested there, by tests/installed.
constexpr milliseconds kLongestStop(5000);

class PromptStopTest : public QueueTest {
 protected:
  /// Sends SIGTERM and fails the test unless the runner then ends in time, with status 1.
  static void ExpectPromptStop(Program& runner) {
    const auto start = steady_clock::now();
    runner.Kill(SIGTERM);
    ExpectEnd(runner, 1);
    EXPECT_LT(steady_clock::now() - start, kLongestStop);
  }
};

TEST_F(PromptStopTest, AConverterThatIgnoresTheSignalIsNotWaitedFor) {
  const StubTool converter(kConverterPath);
  converter.Plan(StubPlan().IgnoreSignal(SIGTERM).CreateFile("/tmp/here").WaitForFile("/tmp/go"));
  const std::string photo = MakePhoto("/tmp/p/a.jpg");
  Enqueue({"/tmp/p"});
  Program runner = StartRunner();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  ExpectPromptStop(runner);
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/p\n");
  EXPECT_THAT(ListDirectory("/tmp/p/@eaDir/a.jpg"), Each(Not(HasSubstr(".fail"))));
  Release();
  converter.Plan(StubPlan::Normal());
  ConvertQueue();
  EXPECT_TRUE(HasThumb(photo));
}

TEST_F(PromptStopTest, SeveralJobsEndTogether) {
  velathumb_.Stub().Plan(StubPlan().WaitForFile("/tmp/go"));
  Enqueue({"/tmp/a", "/tmp/b", "/tmp/c", "/tmp/d"});
  Program runner = velathumb_.Start({"--jobs", "3"});
  ASSERT_TRUE(velathumb_.WaitForStarts(3));
  ExpectPromptStop(runner);
  EXPECT_EQ(ReadFile(kTakenFile), Lines({"/tmp/a", "/tmp/b", "/tmp/c", "/tmp/d"}));
  EXPECT_FALSE(Exists(kJournalFile));
}

/// Becomes true at the third time that it is asked.
std::function<bool()> StopAtThird(int& asked) {
  return [&asked] { return ++asked >= 3; };
}

TEST_F(PromptStopTest, EndsTheSearchForLockedDirectories) {
  MakeDirectories("/tmp/tree/a/b/c/d/e");
  int asked = 0;
  FindSkippedDirectories({"/tmp/tree", true}, StopAtThird(asked));
  EXPECT_EQ(asked, 3);
}

TEST_F(PromptStopTest, EndsTheCountInADirectoryAndSetsNoTotal) {
  for (int i = 0; i < 10; ++i) {
    WriteFile("/tmp/p/" + std::to_string(i) + ".jpg", "");
  }
  int asked = 0;
  // Asked before the entry and before each photo.
  ProgressTotals(false).Set({"/tmp/p"}, StopAtThird(asked));
  EXPECT_LE(asked, 5);
  EXPECT_FALSE(Exists("/var/spool/conv_progress_photo"));
}

TEST_F(PromptStopTest, IsNoticedWithoutTakingAnEventFromTheNextWait) {
  sigset_t before;
  ASSERT_EQ(sigprocmask(SIG_SETMASK, nullptr, &before), 0);
  EventWait events;
  ASSERT_EQ(events.Open(kQueueFile), 0);
  EXPECT_FALSE(events.MustStop());
  ASSERT_EQ(kill(getpid(), SIGCHLD), 0);
  EXPECT_FALSE(events.MustStop());
  const auto start = steady_clock::now();
  events.Wait(milliseconds(10000));
  EXPECT_LT(steady_clock::now() - start, milliseconds(5000));
  ASSERT_EQ(kill(getpid(), SIGTERM), 0);
  EXPECT_TRUE(events.MustStop());
  EXPECT_FALSE(events.IsStopping());
  events.Wait(milliseconds(0));
  EXPECT_TRUE(events.IsStopping());
  EXPECT_TRUE(events.MustStop());
  ASSERT_EQ(sigprocmask(SIG_SETMASK, &before, nullptr), 0);
}

}  // namespace
}  // namespace vela_test
