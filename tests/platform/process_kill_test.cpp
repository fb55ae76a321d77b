// Ending processes by name.
#include <sys/prctl.h>
#include <sys/time.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>

#include "platform/platform_fixture.h"

namespace vela_test {
namespace {

/// A process with this command name that waits for signals; SIGUSR1 ends it with status 11.
pid_t StartNamed(const std::string& name) {
  const std::string ready = "/tmp/ready-" + name;
  const pid_t pid = Fork([&] {
    signal(SIGUSR1, [](int) { _exit(11); });
    prctl(PR_SET_NAME, name.c_str());
    WriteFile(ready, "");
    for (;;) pause();
    return 0;
  });
  EXPECT_TRUE(WaitUntilExists(ready));
  RemoveTree(ready);
  return pid;
}

class ProcessKill : public SandboxTest {};

TEST_F(ProcessKill, SendsSigtermForZero) {
  const pid_t pid = StartNamed("tool-a");
  EXPECT_EQ(VLIBCKill("tool-a", 0), 1);
  EXPECT_EQ(Join(pid), -SIGTERM);
}

TEST_F(ProcessKill, SendsTheGivenSignal) {
  const pid_t pid = StartNamed("tool-a");
  EXPECT_EQ(VLIBCKill("tool-a", SIGUSR1), 1);
  EXPECT_EQ(Join(pid), 11);
}

TEST_F(ProcessKill, ReachesEveryProcessOfTheNameAndNoOther) {
  const pid_t first = StartNamed("tool-a");
  const pid_t second = StartNamed("tool-a");
  const pid_t longer = StartNamed("tool-ab");
  const pid_t shorter = StartNamed("tool-");
  const pid_t capital = StartNamed("Tool-a");
  EXPECT_EQ(VLIBCKill("tool-a", SIGKILL), 2);
  EXPECT_EQ(Join(first), -SIGKILL);
  EXPECT_EQ(Join(second), -SIGKILL);
  for (const pid_t other : {longer, shorter, capital}) {
    EXPECT_EQ(kill(other, 0), 0);
    kill(other, SIGUSR1);
    EXPECT_EQ(Join(other), 11);
  }
}

TEST_F(ProcessKill, MatchesNamesThatTheKernelCuts) {
  const pid_t pid = StartNamed("fifteen-letters-and-more");
  EXPECT_EQ(VLIBCKill("fifteen-letter", 0), 0);
  EXPECT_EQ(VLIBCKill("fifteen-letters-and-more", 0), 1);
  EXPECT_EQ(Join(pid), -SIGTERM);
}

TEST_F(ProcessKill, MatchesNamesWithOddBytes) {
  const pid_t pid = StartNamed("a (b)\tc\xff");
  EXPECT_EQ(VLIBCKill("a (b)\tc\xff", 0), 1);
  EXPECT_EQ(Join(pid), -SIGTERM);
}

TEST_F(ProcessKill, SparesTheCaller) {
  InOwnProcess([] {
    prctl(PR_SET_NAME, "tool-a");
    EXPECT_EQ(VLIBCKill("tool-a", SIGKILL), 0);
  });
}

TEST_F(ProcessKill, DoesNotCountAProcessThatHasEnded) {
  const pid_t pid = StartNamed("tool) R 1 (a");
  EXPECT_EQ(VLIBCKill("tool) R 1 (a", SIGUSR1), 1);
  EXPECT_TRUE(WaitUntil([] { return CountZombies() > 0; }));
  EXPECT_EQ(VLIBCKill("tool) R 1 (a", SIGUSR1), 0);
  EXPECT_EQ(Join(pid), 11);
}

TEST_F(ProcessKill, IsZeroForAnUnusedName) {
  EXPECT_EQ(VLIBCKill("no-such-tool", 0), 0);
}

TEST_F(ProcessKill, RefusesTheEmptyName) {
  EXPECT_EQ(VLIBCKill("", 0), -1);
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
  EXPECT_EQ(VLIBCKill(nullptr, 0), -1);
}

TEST_F(ProcessKill, LeavesErrnoAlone) {
  errno = 123;
  VLIBCKill("no-such-tool", 0);
  EXPECT_EQ(errno, 123);
}

TEST_F(ProcessKill, CanBeCalledFromAHandlerAtAnyMoment) {
  // Most of the time, the interrupted code holds the locks of the allocator and of stdio.
  const int result = RunForked([] {
    struct sigaction action = {};
    action.sa_handler = [](int) { VLIBCKill("no-such-tool", 0); };
    sigaction(SIGALRM, &action, nullptr);
    const itimerval often = {{0, 300}, {0, 300}};
    setitimer(ITIMER_REAL, &often, nullptr);
    FILE* null = fopen("/dev/null", "w");
    for (int i = 0; i < 100000; ++i) {
      char* memory = static_cast<char*>(malloc(static_cast<size_t>(i % 5000 + 1)));
      fprintf(null, "%p %d", static_cast<void*>(memory), i);
      free(memory);
    }
    fclose(null);
    return 0;
  });
  EXPECT_EQ(result, 0);
}

}  // namespace
}  // namespace vela_test
