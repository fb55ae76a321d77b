// What processes do.
#include "posix/processes.h"

#include <gmock/gmock.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <ctime>
#include <functional>
#include <string>

#include "support/files.h"
#include "support/sandbox.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

/// A child that runs `act` and then waits for its end, which the object causes.
class WaitingChild {
 public:
  explicit WaitingChild(const std::function<void()>& act) : pid_(fork()) {
    if (pid_ == 0) {
      act();
      WriteFile("/tmp/ready", "");
      for (;;) {
        pause();
      }
    }
    EXPECT_TRUE(WaitUntilExists("/tmp/ready"));
  }
  ~WaitingChild() {
    kill(pid_, SIGKILL);
    waitpid(pid_, nullptr, 0);
  }
  WaitingChild(const WaitingChild&) = delete;
  WaitingChild& operator=(const WaitingChild&) = delete;

  ProcessActivity Activity() const {
    const auto activity = ActivityOf(pid_);
    EXPECT_TRUE(activity);
    return activity.value_or(ProcessActivity());
  }

 private:
  pid_t pid_;
};

void UseProcessor() {
  while (std::clock() < CLOCKS_PER_SEC / 10) {
  }
}

/// Starts a child that ends with its parent and runs `act`; returns its process id.
pid_t StartGrandchild(const std::function<void()>& act) {
  const pid_t pid = fork();
  if (pid == 0) {
    alarm(60);
    act();
    _exit(0);
  }
  return pid;
}

using ProcessActivityTest = SandboxTest;

TEST_F(ProcessActivityTest, OfAWaitingProcessDoesNotChange) {
  const WaitingChild child([] {});
  const ProcessActivity before = child.Activity();
  usleep(200000);
  const ProcessActivity after = child.Activity();
  EXPECT_EQ(after.cpuTime, before.cpuTime);
  EXPECT_EQ(after.written, before.written);
  EXPECT_THAT(after.descendants, IsEmpty());
}

TEST_F(ProcessActivityTest, ShowsWhetherAProcessIsRunning) {
  EXPECT_TRUE(ActivityOf(getpid())->isRunning);
  const WaitingChild child([] {});
  usleep(100000);
  EXPECT_FALSE(child.Activity().isRunning);
}

TEST_F(ProcessActivityTest, CountsCpuTime) {
  const WaitingChild child(UseProcessor);
  EXPECT_GE(child.Activity().cpuTime, 5U);
}

TEST_F(ProcessActivityTest, CountsCpuTimeOfChildrenAfterTheirEnd) {
  const WaitingChild ended([] { waitpid(StartGrandchild(UseProcessor), nullptr, 0); });
  EXPECT_GE(ended.Activity().cpuTime, 5U);
  EXPECT_THAT(ended.Activity().descendants, IsEmpty());
}

TEST_F(ProcessActivityTest, CountsWrittenBytes) {
  const WaitingChild child([] { WriteFileOfSize("/tmp/file", 100000); });
  EXPECT_GE(child.Activity().written, 100000U);
}

TEST_F(ProcessActivityTest, ListsDescendantsThatHaveNotEnded) {
  const WaitingChild child([] {
    StartGrandchild([] { pause(); });
    StartGrandchild([] {
      StartGrandchild([] { pause(); });
      WriteFile("/tmp/inner", "");
      pause();
    });
    StartGrandchild([] {});
    WaitUntilExists("/tmp/inner");
    usleep(100000);
  });
  EXPECT_THAT(child.Activity().descendants, SizeIs(3));
}

TEST_F(ProcessActivityTest, OfAProcessThatDoesNotExistIsUnknown) {
  EXPECT_EQ(ActivityOf(4000000).has_value(), false);
}

}  // namespace
}  // namespace vela_test
