// Ending processes by name.
#include <sys/prctl.h>
#include <sys/time.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "platform/forked_call.h"
#include "platform/vlibc.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace {

/// A process with this command name that waits for signals; SIGUSR1 ends it with status 11.
pid_t StartNamed(const std::string& name) {
  const std::string ready = "/tmp/ready-" + name;
  const pid_t pid = platform_test::Fork([&] {
    signal(SIGUSR1, [](int) { _exit(11); });
    prctl(PR_SET_NAME, name.c_str());
    vela_test::WriteFile(ready, "");
    for (;;) pause();
    return 0;
  });
  EXPECT_TRUE(vela_test::WaitUntilExists(ready));
  vela_test::RemoveTree(ready);
  return pid;
}

class ProcessKill : public vela_test::SandboxTest {};

TEST_F(ProcessKill, SendsSigtermForZero) {
  const pid_t pid = StartNamed("tool-a");
  EXPECT_EQ(VLIBCKill("tool-a", 0), 1);
  EXPECT_EQ(platform_test::Join(pid), -SIGTERM);
}

TEST_F(ProcessKill, SendsTheGivenSignal) {
  const pid_t pid = StartNamed("tool-a");
  EXPECT_EQ(VLIBCKill("tool-a", SIGUSR1), 1);
  EXPECT_EQ(platform_test::Join(pid), 11);
}

TEST_F(ProcessKill, ReachesEveryProcessOfTheNameAndNoOther) {
  const pid_t first = StartNamed("tool-a");
  const pid_t second = StartNamed("tool-a");
  const pid_t longer = StartNamed("tool-ab");
  const pid_t shorter = StartNamed("tool-");
  const pid_t capital = StartNamed("Tool-a");
  EXPECT_EQ(VLIBCKill("tool-a", SIGKILL), 2);
  EXPECT_EQ(platform_test::Join(first), -SIGKILL);
  EXPECT_EQ(platform_test::Join(second), -SIGKILL);
  for (const pid_t other : {longer, shorter, capital}) {
    EXPECT_EQ(kill(other, 0), 0);
    kill(other, SIGUSR1);
    EXPECT_EQ(platform_test::Join(other), 11);
  }
}

TEST_F(ProcessKill, KnowsNamesThatTheKernelCuts) {
  const pid_t pid = StartNamed("fifteen-letters-and-more");
  EXPECT_EQ(VLIBCKill("fifteen-letter", 0), 0);
  EXPECT_EQ(VLIBCKill("fifteen-letters-and-more", 0), 1);
  EXPECT_EQ(platform_test::Join(pid), -SIGTERM);
}

TEST_F(ProcessKill, KnowsNamesWithOddBytes) {
  const pid_t pid = StartNamed("a (b)\tc\xff");
  EXPECT_EQ(VLIBCKill("a (b)\tc\xff", 0), 1);
  EXPECT_EQ(platform_test::Join(pid), -SIGTERM);
}

TEST_F(ProcessKill, SparesTheCaller) {
  EXPECT_EQ(platform_test::RunForked([] {
              prctl(PR_SET_NAME, "tool-a");
              return VLIBCKill("tool-a", SIGKILL) == 0 ? 0 : 1;
            }),
            0);
}

TEST_F(ProcessKill, DoesNotCountAProcessThatHasEnded) {
  const pid_t pid = StartNamed("tool) R 1 (a");
  EXPECT_EQ(VLIBCKill("tool) R 1 (a", SIGUSR1), 1);
  for (int i = 0; i < 500 && platform_test::CountZombies() == 0; ++i) usleep(10000);
  EXPECT_EQ(VLIBCKill("tool) R 1 (a", SIGUSR1), 0);
  EXPECT_EQ(platform_test::Join(pid), 11);
}

TEST_F(ProcessKill, IsZeroWhenThereIsNone) {
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
  // The interrupted code holds the locks of the allocator and of stdio much of the time.
  const int result = platform_test::RunForked([] {
    struct sigaction action;
    memset(&action, 0, sizeof(action));
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
