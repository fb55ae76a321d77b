// Locks that any user can hold, and files that others have put under the names of lock files:
// nothing of that stops a change of a key/value file or of the queue.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/time.h>

#include "platform/platform_fixture.h"
#include "support/descriptor.h"
#include "support/mounts.h"
#include "support/named_case.h"
#include "support/privileges.h"

namespace vela_test {
namespace {

constexpr const char* kValues = "/var/spool/values";
constexpr const char* kScratch = "/var/spool/values.replacement";
constexpr const char* kQueue = "/var/spool/thumb_create.queue";
constexpr const char* kPrecious = "/tmp/precious";

/// Seconds after which a call counts as stuck.
constexpr int kStuck = 15;

/// A file that several processes change, and one change of it.
struct ChangedFile : NamedCase {
  const char* path;
  const char* guard;
  int (*change)();
  const char* before;
  const char* after;
};

int SetValue() {
  return VLIBCFileSetKeyValue(kValues, "a", "2", 0) == 0 ? 0 : 1;
}

int Append() {
  return WriteIndexQueue("/photo/b", kQueue) == 0 ? 0 : 1;
}

/// Opens the file and locks it, as any user who can read it can do.
Descriptor LockAsReader(const char* path, int operation) {
  Descriptor file(open(path, O_RDONLY | O_CLOEXEC));
  EXPECT_EQ(flock(file.Get(), operation), 0) << path;
  return file;
}

class HostileLock : public SandboxTest, public testing::WithParamInterface<ChangedFile> {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    WriteFile(GetParam().path, GetParam().before);
    WriteFile(kPrecious, "precious");
  }

  static int ChangeWithin(int seconds) { return RunWithin(seconds, GetParam().change); }

  /// The process is ended when it is stuck.
  static pid_t StartChange() {
    return Fork([] {
      alarm(kStuck);
      return GetParam().change();
    });
  }

  static void ExpectChanged() { EXPECT_EQ(ReadFile(GetParam().path), GetParam().after); }

  /// Fails the test unless the change is refused at once and nothing else happens.
  static void ExpectRefused() {
    const Stopwatch watch;
    EXPECT_EQ(ChangeWithin(kStuck), 1);
    watch.ExpectBetween(0, 5);
    EXPECT_EQ(ReadFile(GetParam().path), GetParam().before);
    EXPECT_EQ(ReadFile(kPrecious), "precious");
  }
};

TEST_P(HostileLock, OfAnotherUserOnTheFileIsNotWaitedForWithoutALimit) {
  for (const int operation : {LOCK_SH, LOCK_EX}) {
    WriteFile(GetParam().path, GetParam().before);
    const Descriptor held = LockAsReader(GetParam().path, operation);
    EXPECT_EQ(ChangeWithin(kStuck), 0);
    ExpectChanged();
  }
}

TEST_P(HostileLock, IsWaitedForOnlyOnce) {
  const Stopwatch watch;
  const int result = RunWithin(kStuck, [] {
    for (int i = 0; i < 20; ++i) {
      const Descriptor held = LockAsReader(GetParam().path, LOCK_SH);
      if (GetParam().change() != 0) {
        return 1;
      }
    }
    return 0;
  });
  EXPECT_EQ(result, 0);
  watch.ExpectBetween(1.5, 12);
}

TEST_P(HostileLock, MakesTheChangeFailInTimeWhenNoGuardCanBeMade) {
  const ReadOnlyMount run("/run");
  Descriptor held = LockAsReader(GetParam().path, LOCK_SH);
  EXPECT_EQ(ChangeWithin(kStuck), 1);
  EXPECT_EQ(ReadFile(GetParam().path), GetParam().before);
  held.Close();
  EXPECT_EQ(ChangeWithin(kStuck), 0);
  ExpectChanged();
}

TEST_P(HostileLock, OnAGuardThatOthersCouldOpenDoesNotCount) {
  WriteFile(GetParam().guard, "");
  ASSERT_EQ(chmod(GetParam().guard, 0644), 0);
  const Descriptor held = LockAsReader(GetParam().guard, LOCK_SH);
  const Stopwatch watch;
  EXPECT_EQ(ChangeWithin(kStuck), 0);
  watch.ExpectBetween(0, 5);
  ExpectChanged();
}

TEST_P(HostileLock, FifoAsGuardIsRefused) {
  ASSERT_EQ(mkfifo(GetParam().guard, 0600), 0);
  ExpectRefused();
}

TEST_P(HostileLock, LinksAsGuardAreRefused) {
  ASSERT_EQ(symlink(kPrecious, GetParam().guard), 0);
  ExpectRefused();
  ASSERT_EQ(unlink(GetParam().guard), 0);
  ASSERT_EQ(symlink("/tmp/new", GetParam().guard), 0);
  ExpectRefused();
  EXPECT_FALSE(Exists("/tmp/new"));
  ASSERT_EQ(unlink(GetParam().guard), 0);
  // A second name only exists within one volume.
  WriteFile("/run/other", "precious");
  ASSERT_EQ(chmod("/run/other", 0600), 0);
  ASSERT_EQ(link("/run/other", GetParam().guard), 0);
  ExpectRefused();
  EXPECT_EQ(ReadFile("/run/other"), "precious");
}

TEST_P(HostileLock, FileOfAnotherUserAsGuardIsRefused) {
  WriteFile(GetParam().guard, "");
  ASSERT_EQ(chmod(GetParam().guard, 0600), 0);
  if (!HasOtherUsers()) {
    // Everything in the sandbox belongs to its only user.
    EXPECT_EQ(ChangeWithin(kStuck), 0);
    return;
  }
  ASSERT_EQ(chown(GetParam().guard, 1, 1), 0);
  ExpectRefused();
}

TEST_P(HostileLock, GuardIsPrivateAndGoneAfterwards) {
  const Descriptor held = LockAsReader(GetParam().path, LOCK_SH);
  const pid_t changer = StartChange();
  EXPECT_TRUE(WaitUntil([] { return Exists(GetParam().guard); }));
  EXPECT_EQ(ModeOf(GetParam().guard), 0600);
  EXPECT_EQ(Join(changer), 0);
  EXPECT_FALSE(Exists(GetParam().guard));
}

TEST_P(HostileLock, GuardOfARunningProcessIsWaitedFor) {
  const int result = RunAgainstLock(
      GetParam().guard, [] { return GetParam().change(); },
      [] { EXPECT_EQ(ReadFile(GetParam().path), GetParam().before); });
  EXPECT_EQ(result, 0);
  ExpectChanged();
}

TEST_P(HostileLock, GuardOfAKilledProcessIsTakenOver) {
  {
    const Descriptor held = LockAsReader(GetParam().path, LOCK_SH);
    const pid_t changer = StartChange();
    EXPECT_TRUE(WaitUntil([] { return Exists(GetParam().guard); }));
    kill(changer, SIGKILL);
    EXPECT_EQ(Join(changer), -SIGKILL);
  }
  EXPECT_TRUE(Exists(GetParam().guard));
  EXPECT_EQ(ChangeWithin(kStuck), 0);
  ExpectChanged();
  EXPECT_FALSE(Exists(GetParam().guard));
}

const ChangedFile kChangedFiles[] = {
    {"KeyValueFile", kValues, "/run/velathumb-lock.values", SetValue, "a=\"1\"\n", "a=\"2\"\n"},
    {"Queue", kQueue, "/run/velathumb-lock.thumb_create.queue", Append, "/photo/a\n",
     "/photo/a\n/photo/b\n"}};

INSTANTIATE_TEST_SUITE_P(Files, HostileLock, testing::ValuesIn(kChangedFiles), CaseName());

class HostileScratch : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    WriteFile(kValues, "a=\"1\"\n");
    WriteFile(kScratch, "");
  }
};

TEST_F(HostileScratch, CompleteOneOfAKilledWriterThatOthersLockIsReplaced) {
  ASSERT_EQ(chmod(kScratch, 0644), 0);
  const Descriptor held = LockAsReader(kScratch, LOCK_SH);
  EXPECT_EQ(RunWithin(kStuck, SetValue), 0);
  EXPECT_EQ(ReadFile(kValues), "a=\"2\"\n");
  EXPECT_FALSE(Exists(kScratch));
}

TEST_F(HostileScratch, LockedPrivateOneIsNotWaitedForWithoutALimit) {
  ASSERT_EQ(chmod(kScratch, 0600), 0);
  const Descriptor held = LockAsReader(kScratch, LOCK_EX);
  EXPECT_EQ(RunWithin(kStuck, SetValue), 1);
  EXPECT_EQ(ReadFile(kValues), "a=\"1\"\n");
  EXPECT_TRUE(Exists(kScratch));
}

TEST_F(HostileScratch, FileOfAnotherUserIsNotWrittenTo) {
  ASSERT_EQ(chmod(kScratch, 0600), 0);
  if (HasOtherUsers()) {
    ASSERT_EQ(chown(kScratch, 1, 1), 0);
  }
  const Descriptor other(open(kScratch, O_RDONLY | O_CLOEXEC));
  EXPECT_EQ(RunWithin(kStuck, SetValue), 0);
  struct stat status = {};
  ASSERT_EQ(fstat(other.Get(), &status), 0);
  EXPECT_EQ(status.st_size, HasOtherUsers() ? 0 : 6);
  EXPECT_EQ(ReadFile(kValues), "a=\"2\"\n");
}

}  // namespace
}  // namespace vela_test
