// The lock that keeps a second instance out of a directory.
#include "thumb/directory_lock.h"

#include <sys/file.h>

#include "thumb/thumb_test.h"

using namespace vela;

namespace vela_test {
namespace {

constexpr const char* kRoot = "/tmp/@eaDir";

class LockedDirectory : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories(kRoot);
  }

  /// Whether another process could now lock the directory in this way.
  static bool CanBeLockedElsewhere(int operation = LOCK_EX) {
    const int result = ForkCall([operation] {
      const int descriptor = open(kRoot, O_RDONLY | O_CLOEXEC);
      return flock(descriptor, operation | LOCK_NB) == 0 ? 0 : errno == EWOULDBLOCK ? 1 : 2;
    });
    EXPECT_LT(result, 2);
    return result == 0;
  }
};

TEST_F(LockedDirectory, ExcludesAllOthers) {
  const DirectoryLock lock(kRoot);
  EXPECT_TRUE(lock.IsHeld());
  EXPECT_FALSE(CanBeLockedElsewhere(LOCK_EX));
  EXPECT_FALSE(CanBeLockedElsewhere(LOCK_SH));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(LockedDirectory, IsFreeAfterTheEnd) {
  { const DirectoryLock lock(kRoot); }
  EXPECT_TRUE(CanBeLockedElsewhere());
  EXPECT_THAT(DescriptorsOf(kRoot), IsEmpty());
}

TEST_F(LockedDirectory, IsReleasedAtTheEndDespiteACopyOfTheDescriptor) {
  int copy = -1;
  {
    const DirectoryLock lock(kRoot);
    ASSERT_THAT(DescriptorsOf(kRoot), SizeIs(1));
    copy = fcntl(DescriptorsOf(kRoot)[0], F_DUPFD_CLOEXEC, 0);
  }
  EXPECT_TRUE(CanBeLockedElsewhere());
  close(copy);
}

TEST_F(LockedDirectory, IsNotInheritedByPrograms) {
  const DirectoryLock lock(kRoot);
  ASSERT_THAT(DescriptorsOf(kRoot), SizeIs(1));
  EXPECT_EQ(fcntl(DescriptorsOf(kRoot)[0], F_GETFD), FD_CLOEXEC);
}

TEST_F(LockedDirectory, IsNotWaitedFor) {
  const DirectoryLock first(kRoot);
  const DirectoryLock second(kRoot);
  EXPECT_TRUE(first.IsHeld());
  EXPECT_FALSE(second.IsHeld());
  EXPECT_THAT(DescriptorsOf(kRoot), SizeIs(1));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:849 Failed to lock /tmp/@eaDir"));
}

TEST_F(LockedDirectory, IsNotReleasedByAFailedAttempt) {
  const DirectoryLock first(kRoot);
  { const DirectoryLock second(kRoot); }
  EXPECT_FALSE(CanBeLockedElsewhere());
}

TEST_F(LockedDirectory, IsNotGrantedBesideASharedLock) {
  const int other = open(kRoot, O_RDONLY | O_CLOEXEC);
  ASSERT_EQ(flock(other, LOCK_SH), 0);
  EXPECT_FALSE(DirectoryLock(kRoot).IsHeld());
  close(other);
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:849 Failed to lock /tmp/@eaDir"));
}

TEST_F(LockedDirectory, LogsAVolumeWithoutLocks) {
  const BeforeExec refuseLocks = SeccompFail(FlockCalls(), ENOLCK);
  EXPECT_EQ(ForkCall([&] {
              return refuseLocks() == 0 && !DirectoryLock(kRoot).IsHeld() &&
                             DescriptorsOf(kRoot).empty()
                         ? 0
                         : 1;
            }),
            0);
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:849 Failed to lock /tmp/@eaDir"));
}

TEST_F(LockedDirectory, LogsADirectoryThatIsMissing) {
  EXPECT_FALSE(DirectoryLock("/tmp/missing/@eaDir").IsHeld());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:844 Failed to open /tmp/missing/@eaDir"));
}

TEST_F(LockedDirectory, LogsADirectoryThatMayNotBeRead) {
  ASSERT_EQ(chmod(kRoot, 0333), 0);
  const WithoutCapabilities ordinary;
  EXPECT_FALSE(DirectoryLock(kRoot).IsHeld());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:844 Failed to open /tmp/@eaDir"));
}

TEST_F(LockedDirectory, NeedsNoWritePermission) {
  ASSERT_EQ(chmod(kRoot, 0555), 0);
  const WithoutCapabilities ordinary;
  EXPECT_TRUE(DirectoryLock(kRoot).IsHeld());
}

TEST_F(LockedDirectory, DoesNotBlockOnAPipe) {
  ASSERT_EQ(mkfifo("/tmp/pipe", 0666), 0);
  EXPECT_EQ(ForkCall([] {
              const DirectoryLock lock("/tmp/pipe");
              return 0;
            }),
            0);
}

}  // namespace
}  // namespace vela_test
