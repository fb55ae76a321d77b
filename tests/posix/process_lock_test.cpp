// Looking at the lock of a process without taking it.
#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "posix/file_lock.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/sandbox.h"

using namespace vela;

namespace vela_test {
namespace {

constexpr const char* kLock = "/run/test.lock";

class ProcessLock : public SandboxTest {
 protected:
  /// The state that another process sees.
  static ProcessLockState StateElsewhere() {
    const pid_t child = fork();
    if (child == 0) {
      _exit(static_cast<int>(StateOfProcessLock(kLock)));
    }
    int status = 0;
    EXPECT_EQ(waitpid(child, &status, 0), child);
    return static_cast<ProcessLockState>(WEXITSTATUS(status));
  }
};

TEST_F(ProcessLock, IsFreeWithoutAFile) {
  EXPECT_EQ(StateElsewhere(), ProcessLockState::kFree);
  EXPECT_FALSE(Exists(kLock));
}

TEST_F(ProcessLock, IsHeldUntilItsHolderReleasesIt) {
  FileDescriptor lock = TakeProcessLock(kLock, false);
  ASSERT_TRUE(lock.IsOpen());
  EXPECT_EQ(StateElsewhere(), ProcessLockState::kHeld);
  lock.Reset();
  EXPECT_TRUE(Exists(kLock));
  EXPECT_EQ(StateElsewhere(), ProcessLockState::kFree);
}

TEST_F(ProcessLock, OfAFileThatMayNotBeOpenedIsUnknown) {
  const FileDescriptor lock = TakeProcessLock(kLock, false);
  ASSERT_EQ(chmod(kLock, 0), 0);
  const WithoutCapabilities unprivileged;
  EXPECT_EQ(StateElsewhere(), ProcessLockState::kUnknown);
}

TEST_F(ProcessLock, IsNeverRefusedBecauseOthersLookAtIt) {
  const pid_t observer = fork();
  if (observer == 0) {
    for (;;) {
      StateOfProcessLock(kLock);
    }
  }
  for (int i = 0; i < 5000; ++i) {
    ASSERT_TRUE(TakeProcessLock(kLock, false).IsOpen()) << i;
  }
  kill(observer, SIGKILL);
  EXPECT_EQ(waitpid(observer, nullptr, 0), observer);
}

TEST_F(ProcessLock, OfAFifoOrLinkIsNotWaitedFor) {
  ASSERT_EQ(mkfifo(kLock, 0600), 0);
  EXPECT_EQ(StateElsewhere(), ProcessLockState::kFree);
  RemoveTree(kLock);
  ASSERT_EQ(symlink("/run/other", kLock), 0);
  EXPECT_EQ(StateElsewhere(), ProcessLockState::kFree);
}

}  // namespace
}  // namespace vela_test
